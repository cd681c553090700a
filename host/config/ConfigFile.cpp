#include "host/config/ConfigFile.h"

#include "agent/ErrorText.h"
#include "host/config/ConfigProblems.h"
#include "host/config/ConfigSection.h"
#include "host/config/SinkReader.h"
#include "host/config/SituationReader.h"
#include "host/framework/TraceLevels.h"

#include <array>
#include <cerrno>
#include <cstdio>
#include <limits>
#include <memory>
#include <optional>
#include <utility>

#include <sys/stat.h>

#include <toml++/toml.h>

namespace {

constexpr std::size_t largestFile = 4 * 1024 * 1024; ///< bytes

void requireAbsolute(ConfigSection& section, std::string_view key, const std::string& path) {
    if (path.empty() || path.front() != '/') {
        section.problem(key, "'" + path + "' is no absolute path", "begin it with '/'");
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
            section.problem("max_rows", "is no usable number of rows",
                            "write a number from 1 to 2147483647");
        }
        config.environment.push_back({"ZRM_MAX_ROWS", std::to_string(*rows)});
    }
    if (const std::optional<std::string> trace = section.text("trace")) {
        if (const std::string problem = TraceLevels().parse(*trace); !problem.empty()) {
            section.problem("trace", problem,
                            "write classes of error, flow, detail, fine, all and none, for example "
                            "\"error,LogManager=error+detail\"");
        }
        config.environment.push_back({"QFW_TRC1", *trace});
    }
    section.refuseUnknownKeys();
}

void readHttp(const toml::table& table, ConfigProblems& problems, HostConfig& config) {
    ConfigSection section("http", table, problems);
    const std::string listen = section.text("listen").value_or("127.0.0.1:7186");
    if (!listen.empty()) {
        config.http.listen = ListenAddress::parse(listen);
        if (!config.http.listen) {
            section.problem("listen", "'" + listen + "' is no address to listen at",
                            "write ADDRESS:PORT, for example \"127.0.0.1:7186\", or \"\" for none");
        } else if (!config.http.listen->isLoopback() && !section.has("certificate")) {
            section.problem("listen", "'" + listen + "' can be reached from other machines",
                            "write a loopback address (127.0.0.1, [::1] or localhost), or add "
                            "certificate and key, so that TLS is spoken");
        }
    }
    for (const auto& [key, path] :
         {std::pair{"certificate", &config.http.certificate}, std::pair{"key", &config.http.key}}) {
        if (const std::optional<std::string> file = section.text(key)) {
            requireAbsolute(section, key, *file);
            *path = *file;
        }
    }
    if (section.has("certificate") != section.has("key")) {
        section.problem(section.has("key") ? "key" : "certificate", "stands alone",
                        "give both certificate and key, or neither");
    }
    if (const std::optional<std::string> file = section.text("token_file")) {
        requireAbsolute(section, "token_file", *file);
        config.http.tokenFile = *file;
    }
    section.refuseUnknownKeys();
}

/// A number within bounds; none when the key is missing or the number is not.
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
    if (const std::optional<std::string> directory = section.text("directory")) {
        requireAbsolute(section, "directory", *directory);
        history.directory = *directory;
    }
    history.keepDays = readBounded(section, "keep_days", 1, mostDays).value_or(history.keepDays);
    if (const auto events = readBounded(section, "keep_events", 1, mostEvents)) {
        history.keepEvents = static_cast<std::uint64_t>(*events);
    }
    section.refuseUnknownKeys();
}

void readFile(const toml::table& file, ConfigProblems& problems, HostConfig& config) {
    ConfigSection section("", file, problems);
    if (const std::optional<std::string> directory = section.text("state_directory")) {
        requireAbsolute(section, "state_directory", *directory);
        config.stateDirectory = *directory;
    }
    if (const toml::table* const agent = section.table("agent")) {
        readAgent(*agent, problems, config);
    }
    if (const toml::table* const http = section.table("http")) {
        readHttp(*http, problems, config);
    }
    if (const toml::table* const history = section.table("history")) {
        readHistory(*history, problems, config);
    }
    if (const auto sinks = section.tables("sink")) {
        SinkReader reader(problems);
        config.sinks.clear();
        for (const toml::table* const sink : *sinks) {
            config.sinks.push_back(reader.read(*sink));
        }
    }
    if (const auto situations = section.tables("situation")) {
        SituationReader reader(problems);
        for (const toml::table* const situation : *situations) {
            config.situations.push_back(reader.read(*situation));
        }
    }
    section.refuseUnknownKeys();
}

/// The content of a file, or the error number that says why there is none.
std::variant<std::string, int> content(const std::string& path) {
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> stream(std::fopen(path.c_str(), "re"),
                                                                 &std::fclose);
    struct stat status {};
    if (stream == nullptr || fstat(fileno(stream.get()), &status) != 0) {
        return errno;
    }
    if (S_ISDIR(status.st_mode)) {
        return EISDIR;
    }
    std::string text;
    char buffer[65536];
    while (const std::size_t count = std::fread(buffer, 1, sizeof buffer, stream.get())) {
        text.append(buffer, count);
        if (text.size() > largestFile) {
            return EFBIG;
        }
    }
    if (std::ferror(stream.get()) != 0) {
        return errno;
    }
    return text;
}

} // namespace

ConfigFile::Result ConfigFile::parse(std::string_view text, const std::string& path) {
    ConfigProblems problems(path);
    try {
        const toml::table file = toml::parse(text);
        HostConfig config;
        readFile(file, problems, config);
        if (problems.none()) {
            return config;
        }
    } catch (const toml::parse_error& error) {
        problems.add(static_cast<unsigned>(error.source().begin.line), "",
                     std::string(error.description()), "correct the TOML here");
    }
    return problems.texts();
}

ConfigFile::Result ConfigFile::load(const std::string& path) {
    const auto text = content(path);
    if (const auto* const number = std::get_if<int>(&text)) {
        const ErrorText error(*number);
        ConfigProblems problems(path);
        problems.add(0, "", std::string("cannot be read: ") + error.text(),
                     "make it a file that the agent may read, of at most 4 MiB");
        return problems.texts();
    }
    return parse(std::get<std::string>(text), path);
}
