#ifndef ZRM_HOST_SITUATIONS_COMMAND_H
#define ZRM_HOST_SITUATIONS_COMMAND_H

#include "host/cli/Command.h"
#include "host/cli/SituationOptions.h"

#include <string>
#include <vector>

namespace zrm::host {

/// `zrmctl situations [list|show|add|set|remove|start|stop|validate]`.
class SituationsCommand : public Command {
public:
    explicit SituationsCommand(CLI::App& program);

    bool isChosen() const override;
    int run(Context& context) override;

private:
    using Json = SituationOptions::Json;
    using Action = int (SituationsCommand::*)(Context&);
    struct Choice {
        CLI::App* command;
        Action action;
    };

    CLI::App* declare(const char* name, const char* help, Action action);
    CLI::App* declareNamed(const char* name, const char* help, Action action);
    std::string path(const char* below = "") const;
    int done(Context& context, const Json& answer, const char* what) const;

    int list(Context& context);
    int show(Context& context);
    int add(Context& context);
    int set(Context& context);
    int remove(Context& context);
    int start(Context& context);
    int stop(Context& context);
    int validate(Context& context);

    CLI::App* m_command;
    std::vector<Choice> m_choices;
    std::string m_name;
    SituationOptions m_options;
};

} // namespace zrm::host

#endif
