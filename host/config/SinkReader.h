#ifndef ZRM_HOST_SINK_READER_H
#define ZRM_HOST_SINK_READER_H

#include "host/config/ConfigProblems.h"
#include "host/config/ConfigSection.h"
#include "host/config/SinkConfig.h"
#include "host/config/SinkTypes.h"

#include <map>
#include <string>

namespace zrm::host {

/// Reads the [[sink]] tables of a configuration file.
class SinkReader {
public:
    /// Records what is wrong with the tables in `problems`.
    explicit SinkReader(ConfigProblems& problems);

    /// The sink of one table; meaningless when a problem was recorded.
    SinkConfig read(const toml::table& table);

private:
    void readOption(ConfigSection& section, const SinkOption& option, SinkConfig& sink);
    void checkUnique(ConfigSection& section, const SinkType& type, const SinkConfig& sink);

    ConfigProblems& m_problems;
    std::map<std::string, unsigned> m_names;   ///< line number of each sink's name
    std::map<std::string, unsigned> m_targets; ///< line number of each sink's target
};

} // namespace zrm::host

#endif
