#ifndef ZRM_HOST_EPISODES_COMMAND_H
#define ZRM_HOST_EPISODES_COMMAND_H

#include "host/cli/Commands.h"

#include <string>
#include <vector>

namespace zrm::host {

/// `zrmctl episodes [list|show ID]`: how long situations lasted, and which last now.
class EpisodesCommand : public Command {
public:
    explicit EpisodesCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    void addFilters(CLI::App& command);
    CliStatus list(Context& context);
    CliStatus show(Context& context);

    CLI::App* m_command;
    CLI::App* m_show;
    std::string m_id;
    std::string m_state;
    std::vector<std::string> m_situations;
    std::vector<std::string> m_logs;
    std::vector<std::string> m_groups;
    unsigned m_limit = 0; ///< 0: not given
};

} // namespace zrm::host

#endif
