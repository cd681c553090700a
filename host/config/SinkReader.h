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
    /// Notes what is wrong with the tables.
    explicit SinkReader(ConfigProblems& problems);

    /// The sink of one table; meaningless when a problem was noted.
    SinkConfig read(const toml::table& table);

private:
    void readOption(ConfigSection& section, const SinkOption& option, SinkConfig& sink);
    void checkUnique(ConfigSection& section, const SinkType& type, const SinkConfig& sink);

    ConfigProblems& m_problems;
    std::map<std::string, unsigned> m_names;   ///< line of each sink's name
    std::map<std::string, unsigned> m_targets; ///< line of the place to which each sink delivers
};

} // namespace zrm::host

#endif
