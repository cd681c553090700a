#ifndef ZRM_HOST_REFRESH_COMMAND_H
#define ZRM_HOST_REFRESH_COMMAND_H

#include "host/cli/Command.h"

namespace zrm::host {

/// `zrmctl refresh`: the agent re-reads the configuration of the logs.
class RefreshCommand : public Command {
public:
    explicit RefreshCommand(CLI::App& program);

    bool isChosen() const override;
    int run(Context& context) override;

private:
    CLI::App* m_command;
};

} // namespace zrm::host

#endif
