#ifndef ZRM_HOST_CHECK_COMMAND_H
#define ZRM_HOST_CHECK_COMMAND_H

#include "host/cli/Command.h"

#include <string>

namespace zrm::host {

/// `zrmctl check CONFIG`, `zrmctl check --host FILE`: checks a log configuration, or the agent's
/// own configuration, as the agent would. Needs no agent.
class CheckCommand : public Command {
public:
    explicit CheckCommand(CLI::App& program);

    bool isChosen() const override;
    int run(Context& context) override;

private:
    int checkLogs(Context& context) const;
    int checkHost(Context& context) const;

    CLI::App* m_command;
    std::string m_config;
    std::string m_host;
};

} // namespace zrm::host

#endif
