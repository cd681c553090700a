#ifndef ZRM_HOST_REPORT_COMMAND_H
#define ZRM_HOST_REPORT_COMMAND_H

#include "host/cli/Command.h"

#include <string>
#include <vector>

namespace zrm::host {

/// `zrmctl report LOG`: the entries of a log between two times.
class ReportCommand : public Command {
public:
    explicit ReportCommand(CLI::App& program);

    bool isChosen() const override;
    int run(Context& context) override;

private:
    CLI::App* m_command;
    std::string m_log;
    std::string m_from = "-24h";
    std::string m_to = "now";
    std::vector<std::string> m_where;
    std::vector<std::string> m_columns;
    std::string m_format = "table";
};

} // namespace zrm::host

#endif
