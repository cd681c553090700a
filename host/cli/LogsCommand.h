#ifndef ZRM_HOST_LOGS_COMMAND_H
#define ZRM_HOST_LOGS_COMMAND_H

#include "host/cli/Command.h"

#include <string>

namespace zrm::host {

/// `zrmctl logs [LOG]`: lists the monitored logs, or shows one in detail.
class LogsCommand : public Command {
public:
    explicit LogsCommand(CLI::App& program);

    bool isChosen() const override;
    int run(Context& context) override;

private:
    int list(Context& context);
    int show(Context& context);
    int outcome(bool isWrong) const;

    CLI::App* m_command;
    std::string m_log;
    bool m_check = false;
};

} // namespace zrm::host

#endif
