#ifndef ZRM_HOST_TRACE_COMMAND_H
#define ZRM_HOST_TRACE_COMMAND_H

#include "host/cli/Command.h"

#include <string>

namespace zrm::host {

/// `zrmctl trace LEVELS`: sets what the agent traces from now on.
class TraceCommand : public Command {
public:
    explicit TraceCommand(CLI::App& program);

    bool isChosen() const override;
    int run(Context& context) override;

private:
    CLI::App* m_command;
    std::string m_levels;
};

} // namespace zrm::host

#endif
