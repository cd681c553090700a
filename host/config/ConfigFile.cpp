#include "host/config/ConfigFile.h"

#include "host/config/ConfigProblems.h"
#include "host/config/ConfigSection.h"
#include "host/config/ConfigText.h"
#include "host/config/LogReader.h"
#include "host/config/RuleReader.h"
#include "host/config/SinkReader.h"
#include "host/config/SinkTypes.h"
#include "host/config/SituationReader.h"
#include "host/framework/TraceLevels.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <limits>
#include <optional>
#include <utility>

#include <sys/stat.h>

#include <toml++/toml.h>

namespace zrm::host {

namespace {

constexpr std::size_t largestFile = 4 * 1024 * 1024; ///< bytes

void requireAbsolute(ConfigSection& section, std::string_view key, const std::string& path) {
    if (path.empty() || path.front() != '/') {
        section.problem(key, "'" + path + "' is not an absolute path", "begin it with '/'");
    }
}

void readAgent(const toml::table& table, ConfigProblems& problems, HostConfig& config) {
    struct Key {
        const char* key;
        const char* variable;
    };
    static constexpr std::array<Key, 3> paths = {{{"log_config", "ZRM_CONFIG_FILE"},
                                                  {"syslog_conf", "ZRM_SYSLOG_CONF"},
                                                  {"debug_log", "AGENT_DEBUG_LOG"}}};
    ConfigSection section("agent", table, problems);
    for (const auto& [key, variable] : paths) {
        const std::optional<std::string> path = section.text(key);
        if (path && !path->empty()) {
            requireAbsolute(section, key, *path);
            config.environment.push_back({variable, *path});
        }
    }
    if (const std::optional<std::int64_t> rows = section.number("max_rows")) {
        if (*rows < 1 || *rows > std::numeric_limits<std::int32_t>::max()) {
            section.problem("max_rows", "is not a usable number of rows",
                            "write a number from 1 to 2147483647");
        }
        config.environment.push_back({"ZRM_MAX_ROWS", std::to_string(*rows)});
    }
    if (const std::optional<std::string> trace = section.text("trace")) {
        if (const Result<void> levels = TraceLevels().parse(*trace); !levels) {
            section.problem("trace", levels.error().what,
                            "write classes of error, flow, detail, fine, all and none, for example "
                            "\"error,LogManager=error+detail\"");
        }
        config.environment.push_back({"QFW_TRC1", *trace});
    }
    section.refuseUnknownKeys();
}

/// Reads an absolute path; the target is unchanged when the key is missing.
void readPath(ConfigSection& section, std::string_view key, std::string& target) {
    if (const std::optional<std::string> path = section.text(key)) {
        requireAbsolute(section, key, *path);
        target = *path;
    }
}

/// Reads what a client of the agent needs from [http].
void readHttpAccess(ConfigSection& section, HttpConfig& http) {
    const std::string listen = section.text("listen").value_or("127.0.0.1:7186");
    if (!listen.empty()) {
        http.listen = ListenAddress::parse(listen);
        if (!http.listen) {
            section.problem("listen", "'" + listen + "' is not an address to listen on",
                            "write ADDRESS:PORT, for example \"127.0.0.1:7186\", or \"\" for none");
        }
    }
    readPath(section, "certificate", http.certificate);
    readPath(section, "token_file", http.tokenFile);
}

void readHttp(const toml::table& table, ConfigProblems& problems, HostConfig& config) {
    ConfigSection section("http", table, problems);
    readHttpAccess(section, config.http);
    const std::optional<ListenAddress>& listen = config.http.listen;
    if (listen && !listen->isLoopback() && !section.has("certificate")) {
        section.problem("listen",
                        "'" + section.text("listen").value_or("") +
                            "' can be reached from other machines",
                        "write a loopback address (127.0.0.1, [::1] or localhost), or add "
                        "certificate and key, to use TLS");
    }
    readPath(section, "key", config.http.key);
    if (section.has("certificate") != section.has("key")) {
        section.problem(section.has("key") ? "key" : "certificate", "is given alone",
                        "give both certificate and key, or neither");
    }
    section.refuseUnknownKeys();
}

/// A number within bounds; none when the key is missing or the number is out of bounds.
std::optional<std::int64_t> readBounded(ConfigSection& section, std::string_view key,
                                        std::int64_t least, std::int64_t most) {
    const std::optional<std::int64_t> number = section.number(key);
    if (number && (*number < least || *number > most)) {
        section.problem(key, std::to_string(*number) + " is out of bounds",
                        "write a number from " + std::to_string(least) + " to " +
                            std::to_string(most));
        return std::nullopt;
    }
    return number;
}

void readHistory(const toml::table& table, ConfigProblems& problems, HostConfig& config) {
    constexpr std::int64_t mostDays = 36'500;
    constexpr std::int64_t mostEvents = 1'000'000'000'000;
    ConfigSection section("history", table, problems);
    HistoryConfig& history = config.history;
    history.enabled = section.truth("enabled").value_or(history.enabled);
    readPath(section, "directory", history.directory);
    history.keepDays = readBounded(section, "keep_days", 1, mostDays).value_or(history.keepDays);
    if (const auto events = readBounded(section, "keep_events", 1, mostEvents)) {
        history.keepEvents = static_cast<std::uint64_t>(*events);
    }
    section.refuseUnknownKeys();
}

/// [formats] and [rules]: directories of ready files.
void readDirectories(const char* name, const toml::table& table, ConfigProblems& problems,
                     std::vector<std::string>& directories) {
    ConfigSection section(name, table, problems);
    for (const auto& [directory, line] :
         section.texts("directory").value_or(std::vector<ConfigSection::Text>())) {
        if (directory.empty() || directory.front() != '/') {
            section.problem(line, "directory", "'" + directory + "' is not an absolute path",
                            "begin it with '/'");
        }
        directories.push_back(directory);
    }
    section.refuseUnknownKeys();
}

void readReady(ConfigSection& section, ConfigProblems& problems, HostConfig& config) {
    if (const toml::table* const formats = section.table("formats")) {
        readDirectories("formats", *formats, problems, config.formatDirectories);
    }
    if (const toml::table* const rules = section.table("rules")) {
        readDirectories("rules", *rules, problems, config.ruleDirectories);
    }
}

void readFile(const toml::table& file, ConfigProblems& problems, HostConfig& config) {
    ConfigSection section("", file, problems);
    readPath(section, "state_directory", config.stateDirectory);
    if (const toml::table* const agent = section.table("agent")) {
        readAgent(*agent, problems, config);
    }
    if (const toml::table* const http = section.table("http")) {
        readHttp(*http, problems, config);
    }
    if (const toml::table* const history = section.table("history")) {
        readHistory(*history, problems, config);
    }
    readReady(section, problems, config);
    if (const auto sinks = section.tables("sink")) {
        SinkReader reader(problems);
        config.sinks.clear();
        for (const toml::table* const sink : *sinks) {
            config.sinks.push_back(reader.read(*sink));
        }
    }
    if (const auto logs = section.tables("log")) {
        LogReader reader(config, problems); // what was read so far decides what a log may be
        for (const toml::table* const log : *logs) {
            config.logs.push_back(reader.read(*log));
        }
    }
    SituationReader reader(config.logs, problems);
    if (const auto situations = section.tables("situation")) {
        for (const toml::table* const situation : *situations) {
            config.situations.push_back(reader.read(*situation));
        }
    }
    for (SituationConfig& used :
         RuleReader(config.ruleDirectories, reader, problems).read(section)) {
        config.situations.push_back(std::move(used));
    }
    section.refuseUnknownKeys();
}

void readAccess(const toml::table& file, ConfigProblems& problems, HostConfig& config) {
    ConfigSection section("", file, problems);
    readPath(section, "state_directory", config.stateDirectory);
    if (const toml::table* const table = section.table("http")) {
        ConfigSection http("http", *table, problems);
        readHttpAccess(http, config.http);
    }
    readReady(section, problems, config);
}

/// The contents of a file, or its problem as the only text.
Result<std::string, std::vector<std::string>> contentOf(const std::string& path) {
    return ConfigText::read(path, largestFile).map_error([&](Problem&& problem) {
        problem.cure = "make it a file that the agent may read, of at most 4 MiB";
        ConfigProblems problems(path);
        problems.add(0, problem);
        return problems.texts();
    });
}

/// Records why a text read while the file is in use cannot be the complete file.
void checkWhole(std::string_view text, ConfigProblems& problems) {
    if (text.find_first_not_of(" \t\r\n") == std::string_view::npos) {
        problems.add(0, {"is empty", "write the configuration into it again"});
    } else if (text.back() != '\n') {
        const auto lines = std::count(text.begin(), text.end(), '\n');
        problems.add(static_cast<unsigned>(lines) + 1,
                     {"the file ends within this line", "write the rest of it, or end the line"});
    }
}

using Reading = void(const toml::table& file, ConfigProblems& problems, HostConfig& config);

ConfigFile::Result parsed(std::string_view text, const std::string& path, Reading* read) {
    ConfigProblems problems(path);
    if (const std::optional<toml::table> file = ConfigText::parse(text, problems)) {
        HostConfig config;
        read(*file, problems, config);
        if (problems.none()) {
            return config;
        }
    }
    return tl::unexpected(problems.texts());
}

} // namespace

ConfigFile::Result ConfigFile::parse(std::string_view text, const std::string& path) {
    return parsed(text, path, readFile);
}

ConfigFile::Result ConfigFile::load(const std::string& path) {
    return contentOf(path).and_then([&](const std::string& text) { return parse(text, path); });
}

ConfigFile::Result ConfigFile::loadAccess(const std::string& path) {
    return contentOf(path).and_then(
        [&](const std::string& text) { return parsed(text, path, readAccess); });
}

ConfigFile::Result ConfigFile::reload(const std::string& path) {
    return contentOf(path).and_then([&](const std::string& text) -> Result {
        ConfigProblems problems(path);
        checkWhole(text, problems);
        Result result = parse(text, path);
        return result && !problems.none() ? tl::unexpected(problems.texts()) : result;
    });
}

namespace {

bool holdsSecret(const SinkConfig& sink) {
    const SinkConfig::Texts headers = sink.texts("headers");
    return !sink.text("secret").empty() ||
           std::any_of(headers.begin(), headers.end(),
                       [](const auto& header) { return isSecretHeader(header.first); });
}

} // namespace

std::optional<std::string> warningOfSecrets(const HostConfig& config, const std::string& path) {
    struct stat status {};
    if (stat(path.c_str(), &status) != 0 || (status.st_mode & S_IROTH) == 0 ||
        std::none_of(config.sinks.begin(), config.sinks.end(), holdsSecret)) {
        return std::nullopt;
    }
    return path +
           " contains secrets and every user can read it: move them into separate files "
           "(secret_file, headers_file), or remove the permissions of other users (chmod o= " +
           path + ')';
}

std::optional<std::string> warningOfDebug(const HostConfig& config, const std::string& path) {
    constexpr const char* variable = "AGENT_DEBUG_LOG";
    const char* const value = std::getenv(variable);
    const auto log = std::find_if(config.logs.begin(), config.logs.end(),
                                  [](const LogConfig& one) { return one.debug; });
    const bool isNamed =
        (value != nullptr && *value != '\0') ||
        std::any_of(config.environment.begin(), config.environment.end(),
                    [](const EnvironmentSetting& one) { return one.variable == variable; });
    if (log == config.logs.end() || isNamed) {
        return std::nullopt;
    }
    return path + ':' + std::to_string(log->line) +
           ": log.debug: has no effect without a debug log; write debug_log = "
           "\"/var/lib/zrm/debug.log\" in [agent], or remove the key";
}

} // namespace zrm::host
