#ifndef ZRM_HOST_SINK_OPTION_READER_H
#define ZRM_HOST_SINK_OPTION_READER_H

#include "host/config/ConfigProblems.h"
#include "host/config/ConfigSection.h"
#include "host/config/SinkConfig.h"
#include "host/config/SinkTypes.h"

#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// Reads and checks the value of one option of a sink. The references passed to the constructor
/// must outlive it.
class SinkOptionReader {
public:
    SinkOptionReader(ConfigSection& section, ConfigProblems& problems)
        : m_section(section), m_problems(problems) {}

    /// The value in the section, or the default; none when there is neither or when the value is
    /// invalid, which is recorded as a problem.
    std::optional<SinkConfig::Value> read(const SinkOption& option);

private:
    using Value = std::optional<SinkConfig::Value>;
    Value readText(const SinkOption& option);
    Value readNumber(const SinkOption& option);
    Value readDuration(const SinkOption& option);
    Value readTexts(const SinkOption& option);
    void checkText(const SinkOption& option, const std::string& text);

    ConfigSection& m_section;
    ConfigProblems& m_problems;
};

} // namespace zrm::host

#endif
