#ifndef ZRM_HOST_SITUATION_READER_H
#define ZRM_HOST_SITUATION_READER_H

#include "host/config/ConditionParser.h"
#include "host/config/ConfigProblems.h"
#include "host/config/ConfigSection.h"
#include "host/config/HostConfig.h"

#include <map>
#include <string>
#include <vector>

/// Reads the [[situation]] tables of a configuration file.
class SituationReader {
public:
    /// Notes what is wrong with the tables.
    explicit SituationReader(ConfigProblems& problems);

    /// The situation of one table; meaningless when a problem was noted.
    SituationConfig read(const toml::table& table);

private:
    void readName(ConfigSection& section, SituationConfig& situation);
    void readSeverity(ConfigSection& section, SituationConfig& situation);
    void readLog(ConfigSection& section, SituationConfig& situation);
    void readConditions(ConfigSection& section, SituationConfig& situation);
    void readThresholds(ConfigSection& section, SituationConfig& situation);

    ConfigProblems& m_problems;
    ConditionParser m_parser;
    std::map<std::string, unsigned> m_names; ///< line of each situation's name
};

#endif
