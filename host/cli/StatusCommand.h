#ifndef ZRM_HOST_STATUS_COMMAND_H
#define ZRM_HOST_STATUS_COMMAND_H

#include "host/cli/Command.h"

namespace zrm::host {

/// `zrmctl status`: the state of the agent itself.
class StatusCommand : public Command {
public:
    explicit StatusCommand(CLI::App& program);

    bool isChosen() const override;
    int run(Context& context) override;

private:
    CLI::App* m_command;
    bool m_check = false;
};

} // namespace zrm::host

#endif
