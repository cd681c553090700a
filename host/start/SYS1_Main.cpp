#include "framework/agent_calls.h"
#include "host/base/Say.h"
#include "host/base/WatchedFile.h"
#include "host/config/ConfigFile.h"
#include "host/config/SituationWarnings.h"
#include "host/framework/EventRoomControl.h"
#include "host/framework/TraceControl.h"
#include "host/sources/CompressedGeneration.h"
#include "host/start/CommandLine.h"
#include "host/start/Descriptors.h"
#include "host/start/Host.h"
#include "host/start/ServiceNotifier.h"

#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <utility>

#include <signal.h>
#include <unistd.h>

using namespace zrm;
using namespace zrm::host;

namespace {

constexpr const char* defaultConfig = "/etc/zrm/zrm.toml";
constexpr int unusableStatus = 2;

CommandLine readCommandLine(int argc, char** argv) {
    const auto count = static_cast<std::size_t>(argc > 0 ? argc - 1 : 0);
    Result<CommandLine> commandLine = CommandLine::parse({argv + (argc > 0 ? 1 : 0), count});
    if (!commandLine) {
        say("%s; zrmagent --help lists the arguments", commandLine.error().text().c_str());
        std::exit(unusableStatus);
    }
    if (commandLine->wantsHelp() || commandLine->wantsVersion()) {
        std::fputs(commandLine->wantsHelp() ? CommandLine::help().c_str()
                                            : "zrmagent " ZRM_VERSION "\n",
                   stdout);
        std::exit(0);
    }
    return std::move(*commandLine);
}

HostConfig readConfig(const std::string& path) {
    if (path.empty()) {
        return {};
    }
    ConfigFile::Result config = ConfigFile::load(path);
    if (!config) {
        for (const std::string& problem : config.error()) {
            say("%s", problem.c_str());
        }
        std::exit(unusableStatus);
    }
    for (const auto& warning : {warningOfSecrets(*config, path), warningOfDebug(*config, path)}) {
        if (warning) {
            say("%s", warning->c_str());
        }
    }
    for (const std::string& warning : warningsOfSituations(*config, path)) {
        say("%s", warning.c_str());
    }
    return std::move(*config);
}

/// The trace goes where the command line says, at the level set in the environment.
void setTrace(const std::string& file) {
    if (const Result<void> opened = TraceControl::openFile(file); !opened) {
        say("%s", opened.error().text().c_str());
        std::exit(unusableStatus);
    }
    const char* const levels = std::getenv("QFW_TRC1");
    if (const Result<void> configured = TraceControl::configure(levels == nullptr ? "" : levels);
        !configured) {
        say("QFW_TRC1: %s; only errors are traced", configured.error().text().c_str());
    }
}

/// Ends a process that is asked to stop before anything reads a log. The agent takes signals
/// otherwise only once its manager thread waits for them, and the history may take long to open.
void endAtOnceWhenAsked() {
    for (const int number : {SIGTERM, SIGINT}) {
        struct sigaction action {};
        const bool isKnown = sigaction(number, nullptr, &action) == 0;
        // A shell has background programs ignore SIGINT; the manager thread takes it all the same.
        if (isKnown && (action.sa_handler == SIG_DFL || action.sa_handler == SIG_IGN)) {
            action.sa_handler = [](int) { _exit(0); };
            sigaction(number, &action, nullptr);
        }
    }
}

} // namespace

void SYS1_Main(int* argc, char** argv, const char* /*component*/) {
    endAtOnceWhenAsked();
    StandardStreams::fill();
    Descriptors::raiseLimit();
    EventRoomControl::hold(); // until the situations are open
    const CommandLine commandLine = readCommandLine(*argc, argv);
    std::string path = commandLine.config();
    if (path.empty() && access(defaultConfig, F_OK) == 0) {
        path = defaultConfig;
    }
    WatchedFile file(path); // before it is read, so that no change is missed
    HostConfig config = readConfig(path);
    for (const EnvironmentSetting& setting : config.environment) {
        constexpr int keepWhatIsSet = 0;
        setenv(setting.variable.c_str(), setting.value.c_str(), keepWhatIsSet);
    }
    setTrace(commandLine.traceFile());
    GenerationReader::setOpen(openCompressedGeneration);
    Host::instance().configure(std::move(config), std::move(file),
                               ServiceNotifier::takeFromEnvironment());
    Host::instance().findLogs(commandLine.traceFile());
}
