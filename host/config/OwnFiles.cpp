#include "host/config/OwnFiles.h"

namespace zrm::host {

std::map<std::string, std::string> ownFilesOf(const HostConfig& config) {
    std::map<std::string, std::string> files;
    const std::string& directory =
        config.history.directory.empty() ? config.stateDirectory : config.history.directory;
    for (const char* const suffix : {"", "-wal", "-shm"}) {
        files.emplace(directory + "/history.db" + suffix, "the history");
    }
    files.emplace(config.stateDirectory + "/situations.json", "the situations of the API");
    for (const SinkConfig& sink : config.sinks) {
        if (const std::string path = sink.text("path"); path.starts_with('/')) {
            files.emplace(path, "the output of a sink");
        }
    }
    for (const EnvironmentSetting& setting : config.environment) {
        if (setting.variable == "AGENT_DEBUG_LOG") {
            files.emplace(setting.value, "the debug log");
        }
    }
    return files;
}

} // namespace zrm::host
