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

/// The options in which a command line describes a situation.
class SituationOptions {
public:
    using Json = nlohmann::ordered_json;

    /// Declares them for a command. The object outlives the reading of the command line.
    void addTo(CLI::App& command);

    /// The definition: that of --file, or `base`, with the members that options name and without
    /// those that they name with an empty value. Throws CliError when the file cannot be used.
    Json definition(const Json& base) const;

    /// What a request names: a situation by its name, or the definition of a file. Throws CliError
    /// unless exactly one of them is given.
    static Json subject(const std::string& name, const std::string& file);

    /// True when any option was given.
    bool areGiven() const;

private:
    /// A member of a definition, and the option of one command that gives it.
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
};

} // namespace zrm::host

#endif
