#ifndef ZRM_HOST_EXPLAIN_COMMAND_H
#define ZRM_HOST_EXPLAIN_COMMAND_H

#include "host/cli/Command.h"
#include "host/cli/SituationOptions.h"

#include <cstdint>
#include <string>

namespace zrm::host {

/// `zrmctl explain SITUATION`: why a line, an event or the last entries of a log raise it or not.
class ExplainCommand : public Command {
public:
    explicit ExplainCommand(CLI::App& program);

    bool isChosen() const override;
    int run(Context& context) override;

private:
    SituationOptions::Json request() const;

    CLI::App* m_command;
    std::string m_situation;
    std::string m_file;
    std::string m_line;
    std::string m_log;
    std::uint64_t m_event = 0;
    unsigned m_last = 0;
};

} // namespace zrm::host

#endif
