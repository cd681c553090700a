#ifndef ZRM_HOST_FORMAT_COMMANDS_H
#define ZRM_HOST_FORMAT_COMMANDS_H

#include "host/cli/Commands.h"
#include "host/config/ConfigFile.h"

#include <string>
#include <vector>

namespace zrm::host {

class ReadyFormats;
class ReadyRules;

/// What the agent's configuration says of the directories of ready files. Without an agent there
/// may be none, unless `config` names it: then it throws CliError.
ConfigFile::Result agentAccess(const std::string& config);

/// Finds the ready formats as the agent does: in the directories of an option, of the agent's
/// configuration, and in the usual ones.
ReadyFormats readyFormatsOf(const std::string& config, std::vector<std::string> directories);

/// `zrmctl formats [list|show|test]`: the ready formats. Needs no agent.
class FormatsCommand : public Command {
public:
    explicit FormatsCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    CliStatus list(Context& context);
    CliStatus show(Context& context);
    CliStatus test(Context& context);
    ReadyFormats formats(const Context& context) const;

    CLI::App* m_command;
    CLI::App* m_show;
    CLI::App* m_test;
    std::vector<std::string> m_directories;
    std::string m_name;
    std::vector<std::string> m_names;
};

/// `zrmctl rules [list|show|test]`: the ready situations. Needs no agent.
class RulesCommand : public Command {
public:
    explicit RulesCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    CliStatus list(Context& context) const;
    CliStatus show(Context& context) const;
    CliStatus test(Context& context) const;
    ReadyRules rules(const Context& context) const;

    CLI::App* m_command;
    CLI::App* m_show;
    CLI::App* m_test;
    std::vector<std::string> m_directories;
    std::string m_name;
    std::vector<std::string> m_names;
};

/// `zrmctl suggest FILE`: which ready format fits a file. Needs no agent.
class SuggestCommand : public Command {
public:
    explicit SuggestCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    CLI::App* m_command;
    std::string m_file;
    std::vector<std::string> m_directories;
};

} // namespace zrm::host

#endif
