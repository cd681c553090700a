#ifndef ZRM_HOST_READY_RULES_H
#define ZRM_HOST_READY_RULES_H

#include "host/base/Result.h"
#include "host/config/HostConfig.h"
#include "host/config/ReadyFiles.h"

#include <memory>
#include <string>
#include <vector>

#include <toml++/toml.h>

namespace zrm::host {

/// A ready situation: a file NAME.toml in a directory of rules, with entries that count for it and
/// others that do not.
struct ReadyRule {
    struct Sample {
        std::string entry;
        std::string format;  ///< ready format that takes the entry apart; empty: a syslog file
        bool isMiss = false; ///< the entry must not meet the conditions
        unsigned line = 0;   ///< in the file
    };

    std::string name;
    std::string path;
    std::string about;             ///< one line for people
    std::vector<std::string> logs; ///< paths of logs that have such entries, and "journal"
    std::string format;            ///< of these logs; empty: as they are by default
    std::string text;              ///< the file's
    SituationConfig situation;     ///< named like the rule
    std::shared_ptr<const toml::table> table; ///< the situation as written
    std::vector<Sample> samples;
};

/// Finds the ready situations of some directories. Any thread; reads the files anew at each call.
class ReadyRules {
public:
    using Place = ReadyFiles::Place;

    /// A name is looked for in these directories first, then in the usual ones.
    explicit ReadyRules(std::vector<std::string> directories);

    /// Reads the rule with this name. The problem names the file where one is at fault.
    Result<ReadyRule> find(const std::string& name) const;
    /// All rules in the order of their names. Of several with one name, the one that counts.
    std::vector<Place> list() const { return m_files.list(); }

    /// Reads a file. What is wrong with it, as ConfigProblems::texts.
    static Result<ReadyRule, std::vector<std::string>> load(const Place& place);

private:
    ReadyFiles m_files;
};

} // namespace zrm::host

#endif
