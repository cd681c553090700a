#ifndef ZRM_HOST_TRY_COMMAND_H
#define ZRM_HOST_TRY_COMMAND_H

#include "host/cli/Command.h"

#include <cstddef>
#include <string>

namespace zrm::host {

/// `zrmctl try FORMAT FILE`: how a format specifier parses the lines of a file, or where they fail
/// to match. Needs no agent.
class TryCommand : public Command {
public:
    explicit TryCommand(CLI::App& program);

    bool isChosen() const override;
    int run(Context& context) override;

private:
    CLI::App* m_command;
    std::string m_format;
    std::string m_file;
    std::size_t m_lines = 100;
};

} // namespace zrm::host

#endif
