#ifndef ZRM_HOST_CLI_COMMAND_H
#define ZRM_HOST_CLI_COMMAND_H

namespace CLI {
class App;
}

namespace zrm::host {

class Context;

/// One command of zrmctl. Its constructor declares the command and its options.
class Command {
public:
    virtual ~Command() = default;

    /// Whether the parsed command line names this command.
    virtual bool isChosen() const = 0;

    /// Runs the command. Returns a CliStatus, or throws CliError.
    virtual int run(Context& context) = 0;
};

} // namespace zrm::host

#endif
