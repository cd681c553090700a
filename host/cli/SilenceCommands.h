#ifndef ZRM_HOST_SILENCE_COMMANDS_H
#define ZRM_HOST_SILENCE_COMMANDS_H

#include "host/cli/Commands.h"

#include <string>
#include <vector>

#include <nlohmann/json_fwd.hpp>

namespace zrm::host {

/// The name of whoever runs the program, also through sudo.
std::string operatorName();

/// `zrmctl silence [list|show|add|expire]`: silences, which keep events from the sinks.
class SilenceCommand : public Command {
public:
    explicit SilenceCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    using Json = nlohmann::ordered_json;
    using Action = CliStatus (SilenceCommand::*)(Context&);
    struct Choice {
        CLI::App* command;
        Action action;
    };

    CLI::App* declare(const char* name, const char* help, Action action);
    void declareAdd();
    Json match() const;
    std::string until() const;

    CliStatus list(Context& context);
    CliStatus show(Context& context);
    CliStatus add(Context& context);
    CliStatus expire(Context& context);

    CLI::App* m_command;
    std::vector<Choice> m_choices;
    std::string m_id;
    bool m_withExpired = false;
    std::string m_situation;
    std::string m_log;
    std::string m_severity;
    std::string m_node;
    std::vector<std::string> m_groups;
    bool m_isAll = false;
    std::string m_for;
    std::string m_until;
    std::string m_who;
    std::string m_why;
};

} // namespace zrm::host

#endif
