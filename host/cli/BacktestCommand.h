#ifndef ZRM_HOST_BACKTEST_COMMAND_H
#define ZRM_HOST_BACKTEST_COMMAND_H

#include "host/cli/Command.h"

#include <string>

namespace zrm::host {

/// `zrmctl backtest SITUATION`: how often and when a situation would have been raised.
class BacktestCommand : public Command {
public:
    explicit BacktestCommand(CLI::App& program);

    bool isChosen() const override;
    int run(Context& context) override;

private:
    CLI::App* m_command;
    std::string m_situation;
    std::string m_file;
    std::string m_from = "-24h";
    std::string m_to = "now";
};

} // namespace zrm::host

#endif
