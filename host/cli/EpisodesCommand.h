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
    bool m_isUnacknowledged = false;
    std::vector<std::string> m_situations;
    std::vector<std::string> m_logs;
    std::vector<std::string> m_groups;
    unsigned m_limit = 0; ///< 0: not given
};

/// `zrmctl ack ID`: acknowledges an episode, or withdraws that.
class AckCommand : public Command {
public:
    explicit AckCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    CLI::App* m_command;
    std::string m_id;
    std::string m_note;
    std::string m_who;
    bool m_isWithdrawn = false;
};

} // namespace zrm::host

#endif
