#ifndef ZRM_HOST_SITUATION_READER_H
#define ZRM_HOST_SITUATION_READER_H

#include "host/config/ConditionBuilder.h"
#include "host/config/ConfigProblems.h"
#include "host/config/ConfigSection.h"
#include "host/config/HostConfig.h"

#include <map>
#include <string>
#include <vector>

namespace zrm::host {

/// Reads the [[situation]] tables of a configuration file.
class SituationReader {
public:
    /// `logs`: those of the file. Records what is wrong with the tables in `problems`.
    SituationReader(const std::vector<LogConfig>& logs, ConfigProblems& problems)
        : m_logs(logs), m_problems(problems) {}

    /// The situation of one table; meaningless when a problem was recorded. Problems name the table
    /// as `section`. A situation that must not have a name of its own is given one.
    SituationConfig read(const toml::table& table, const std::string& name = {},
                         const char* section = "situation");

private:
    void noteName(ConfigSection& section, const std::string& name);
    void checkLog(ConfigSection& section, const std::string& log);

    const std::vector<LogConfig>& m_logs;
    ConfigProblems& m_problems;
    PatternBudget m_patterns{PatternBudget::ofSource};
    std::map<std::string, unsigned> m_names; ///< line number of each situation's name
};

} // namespace zrm::host

#endif
