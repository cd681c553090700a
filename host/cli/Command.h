#ifndef ZRM_HOST_CLI_COMMAND_H
#define ZRM_HOST_CLI_COMMAND_H

class Context;

namespace CLI {
class App;
}

/// One command of zrmctl. Its constructor declares the command and its options.
class Command {
public:
    virtual ~Command() = default;

    /// True when the command line, once it is read, names this command.
    virtual bool isChosen() const = 0;

    /// Does it. Returns a CliStatus, or throws CliError.
    virtual int run(Context& context) = 0;
};

#endif
