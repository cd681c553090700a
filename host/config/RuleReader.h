#ifndef ZRM_HOST_RULE_READER_H
#define ZRM_HOST_RULE_READER_H

#include "host/config/ConfigProblems.h"
#include "host/config/ConfigSection.h"
#include "host/config/HostConfig.h"
#include "host/config/ReadyRules.h"
#include "host/config/SituationReader.h"

#include <string>
#include <vector>

namespace zrm::host {

/// Reads the key `use` of a configuration file, which switches ready situations on: a list of their
/// names, or tables that also change some of their keys.
class RuleReader {
public:
    /// The situations become those of `reader`. Records what is wrong in `problems`.
    RuleReader(std::vector<std::string> directories, SituationReader& reader,
               ConfigProblems& problems)
        : m_rules(std::move(directories)), m_reader(reader), m_problems(problems) {}

    /// The situations that the file's top level uses; meaningless when a problem was recorded.
    std::vector<SituationConfig> read(ConfigSection& file);

private:
    void readNames(ConfigSection& file);
    void readTable(const toml::table& table);
    void add(const std::string& name, unsigned line, const toml::table& changes);

    const ReadyRules m_rules;
    SituationReader& m_reader;
    ConfigProblems& m_problems;
    std::vector<SituationConfig> m_situations;
};

} // namespace zrm::host

#endif
