#ifndef ZRM_HOST_COMMANDS_H
#define ZRM_HOST_COMMANDS_H

#include "host/cli/CliError.h"
#include "host/cli/SituationOptions.h"

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>
#include <vector>

namespace CLI {
class App;
} // namespace CLI

namespace zrm::host {

class Context;

/// One command of zrmctl. Its constructor declares the command and its options.
class Command {
public:
    virtual ~Command() = default;

    /// Whether the parsed command line names this command.
    virtual bool isChosen() const = 0;

    /// Runs the command. May throw CliError.
    virtual CliStatus run(Context& context) = 0;
};

/// `zrmctl status`: the state of the agent itself.
class StatusCommand : public Command {
public:
    explicit StatusCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    CLI::App* m_command;
    bool m_check = false;
};

/// `zrmctl logs [LOG]`: lists the monitored logs, or shows one in detail.
class LogsCommand : public Command {
public:
    explicit LogsCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    CliStatus list(Context& context);
    CliStatus show(Context& context);
    CliStatus outcome(bool isWrong) const;

    CLI::App* m_command;
    std::string m_log;
    bool m_check = false;
};

/// `zrmctl events [-f]`: past events, and new ones as they are raised; those of an episode as one.
class EventsCommand : public Command {
public:
    explicit EventsCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    std::multimap<std::string, std::string> filters() const;
    CliStatus list(Context& context);
    CliStatus follow(Context& context);

    CLI::App* m_command;
    bool m_follow = false;
    bool m_isAll = false; ///< each event of an episode
    std::string m_after;
    std::string m_before;
    std::string m_from;
    std::string m_to;
    std::vector<std::string> m_situations;
    std::vector<std::string> m_logs;
    std::vector<std::string> m_severities;
    std::string m_silenced;
    std::string m_text;
    unsigned m_limit = 0; ///< 0: not given
};

/// `zrmctl report LOG`: the entries of a log between two times.
class ReportCommand : public Command {
public:
    explicit ReportCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    class Receiver;

    CLI::App* m_command;
    std::string m_log;
    std::string m_from = "-24h";
    std::string m_to = "now";
    std::vector<std::string> m_where;
    std::vector<std::string> m_columns;
    std::vector<std::string> m_fields; ///< without "field."
    std::string m_format = "table";
    std::size_t m_limit = 1000;
};

/// `zrmctl situations [list|show|add|set|remove|start|stop|validate]`.
class SituationsCommand : public Command {
public:
    explicit SituationsCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    using Json = SituationOptions::Json;
    using Action = CliStatus (SituationsCommand::*)(Context&);
    struct Choice {
        CLI::App* command;
        Action action;
    };

    CLI::App* declare(const char* name, const char* help, Action action);
    CLI::App* declareNamed(const char* name, const char* help, Action action);
    std::string path(const char* below = "") const;
    CliStatus done(Context& context, const Json& answer, const char* what) const;

    CliStatus list(Context& context);
    CliStatus show(Context& context);
    CliStatus add(Context& context);
    CliStatus set(Context& context);
    CliStatus remove(Context& context);
    CliStatus start(Context& context);
    CliStatus stop(Context& context);
    CliStatus validate(Context& context);

    CLI::App* m_command;
    std::vector<Choice> m_choices;
    std::string m_name;
    SituationOptions m_options;
};

/// `zrmctl explain SITUATION`: why a line, an event or the last entries of a log raise it or not.
class ExplainCommand : public Command {
public:
    explicit ExplainCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    SituationOptions::Json request() const;

    CLI::App* m_command;
    std::string m_situation;
    std::string m_file;
    std::string m_line;
    std::string m_log;
    std::string m_to;
    std::uint64_t m_event = 0;
    unsigned m_last = 0;
};

/// `zrmctl backtest SITUATION`: how often and when a situation would have been raised.
class BacktestCommand : public Command {
public:
    explicit BacktestCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    CLI::App* m_command;
    std::string m_situation;
    std::string m_file;
    std::string m_from = "-24h";
    std::string m_to = "now";
};

/// `zrmctl refresh`: the agent re-reads the configuration of the logs.
class RefreshCommand : public Command {
public:
    explicit RefreshCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    CLI::App* m_command;
};

/// `zrmctl trace LEVELS`: sets what the agent traces from now on.
class TraceCommand : public Command {
public:
    explicit TraceCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    CLI::App* m_command;
    std::string m_levels;
};

/// `zrmctl check CONFIG`, `zrmctl check --host FILE`: checks a log configuration, or the agent's
/// own configuration, as the agent would. Needs no agent.
class CheckCommand : public Command {
public:
    explicit CheckCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    CliStatus checkLogs(Context& context) const;
    CliStatus checkHost(Context& context) const;

    CLI::App* m_command;
    std::string m_config;
    std::string m_host;
};

/// `zrmctl try FORMAT FILE`: how a format specifier parses the lines of a file, or where they fail
/// to match. Needs no agent.
class TryCommand : public Command {
public:
    explicit TryCommand(CLI::App& program);

    bool isChosen() const override;
    CliStatus run(Context& context) override;

private:
    CLI::App* m_command;
    std::string m_format; ///< with --type syslog, the file
    std::string m_file;
    std::string m_type = "text";
    std::string m_timezone;
    bool m_isTable = false;
    std::size_t m_lines = 100;
};

} // namespace zrm::host

#endif
