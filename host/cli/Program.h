#ifndef ZRM_HOST_CLI_PROGRAM_H
#define ZRM_HOST_CLI_PROGRAM_H

#include "host/cli/AgentAccess.h"
#include "host/cli/Commands.h"

#include <memory>
#include <vector>

namespace zrm::host {

/// zrmctl: its commands, and how a command line selects one.
class Program {
public:
    Program();
    ~Program();
    Program(const Program&) = delete;
    Program& operator=(const Program&) = delete;

    /// Parses the command line and runs the command. Returns the exit status.
    CliStatus run(int argc, const char* const* argv);

private:
    CliStatus runCommand();

    CommonOptions m_options;
    std::unique_ptr<CLI::App> m_app;
    std::vector<std::unique_ptr<Command>> m_commands;
};

} // namespace zrm::host

#endif
