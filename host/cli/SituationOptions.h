#ifndef ZRM_HOST_SITUATION_OPTIONS_H
#define ZRM_HOST_SITUATION_OPTIONS_H

#include <string>
#include <vector>

#include <nlohmann/json_fwd.hpp>

namespace CLI {
class App;
class Option;
} // namespace CLI

namespace zrm::host {

/// The command-line options that describe a situation.
class SituationOptions {
public:
    using Json = nlohmann::ordered_json;

    /// Adds the options to a command. The object must outlive the parsing of the command line.
    void addTo(CLI::App& command);

    /// The definition from --file, or else `base`, with the members set by options; an option with
    /// an empty value removes its member. Has the version of where it comes from. Throws CliError
    /// when the file cannot be used.
    Json definition(const Json& base) const;

    /// The subject of a request: a situation by name, or a definition from a file. Throws CliError
    /// unless exactly one of the two is given.
    static Json subject(const std::string& name, const std::string& file);

    /// True when any option was given.
    bool areGiven() const;

private:
    /// A member of a definition and the option that sets it.
    struct Member {
        const char* key;
        const CLI::Option* option;
        const std::string* value;
    };
    std::vector<Member> m_members;
    std::string m_file;
    std::string m_text;
    std::string m_severity;
    std::string m_log;
    std::vector<std::string> m_when;
    std::string m_frequency;
    std::string m_period;
    std::string m_context;
    std::string m_runbook;
    std::vector<std::string> m_labels; ///< as written
    std::vector<std::string> m_groupBy;
    std::string m_maxGroups;
    std::string m_distinct;
    std::string m_then;
    std::string m_resolveAfter;
    std::string m_cooldown;
    std::string m_absent;
};

} // namespace zrm::host

#endif
