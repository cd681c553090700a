#ifndef ZRM_HOST_EVENTS_COMMAND_H
#define ZRM_HOST_EVENTS_COMMAND_H

#include "host/cli/Command.h"

#include <map>
#include <string>
#include <vector>

namespace zrm::host {

/// `zrmctl events [-f]`: past events, and new ones as they are raised.
class EventsCommand : public Command {
public:
    explicit EventsCommand(CLI::App& program);

    bool isChosen() const override;
    int run(Context& context) override;

private:
    std::multimap<std::string, std::string> filters() const;
    int list(Context& context);
    int follow(Context& context);

    CLI::App* m_command;
    bool m_follow = false;
    std::string m_after;
    std::string m_before;
    std::string m_from;
    std::string m_to;
    std::vector<std::string> m_situations;
    std::vector<std::string> m_logs;
    std::vector<std::string> m_severities;
    std::string m_text;
    unsigned m_limit = 0; ///< 0: not given
};

} // namespace zrm::host

#endif
