#include "host/diagnose/UnmonitoredLogs.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "host/base/JsonWriter.h"
#include "host/base/Utf8.h"
#include "host/diagnose/ConfigCheck.h"
#include "host/diagnose/LogLedgers.h"
#include "host/framework/CodePages.h"
#include "host/framework/Converter.h"
#include "logmgr/LogManager.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <fstream>
#include <iterator>

#include <sys/stat.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"UnmonitoredLogs.cpp"};

constexpr std::string_view spaces = " \t\v\f\r";

/// The log named in a line.
std::string_view nameIn(std::string_view line) {
    line.remove_prefix(std::min(line.find_first_not_of(spaces), line.size()));
    return line.substr(0, line.find_first_of(" \t"));
}

/// The text without the lines of monitored logs, which need no verdict; the other lines keep their
/// numbers. Empty when none is left.
std::string others(std::string_view text, const std::set<std::string>& monitored) {
    std::string left;
    bool isAnyLeft = false;
    while (!text.empty()) {
        const std::size_t end = std::min(text.find('\n'), text.size());
        const std::string_view name = nameIn(text.substr(0, end));
        if (!name.empty() && name[0] != '#' && !monitored.contains(std::string(name))) {
            left += text.substr(0, end);
            isAnyLeft = true;
        }
        const std::size_t next = std::min(end + 1, text.size());
        left += text.substr(end, next - end);
        text.remove_prefix(next);
    }
    return isAnyLeft ? left : std::string();
}

/// A name in UTF-8, as the API and the metrics need; the process may use another code page.
std::string inUtf8(std::string_view name) {
    if (Utf8::validPrefix(name) == name.size()) {
        return std::string(name);
    }
    constexpr std::size_t maxGrowth = 3;
    std::string text(name.size() * maxGrowth, '\0');
    const LOC2_Locale& utf8 = *CodePages::byNumber(LOC2_UTF8);
    const LOC2_Locale* const local = LOC2_GetLocale(0, 0, 0, nullptr);
    Converted converted = Converter::convert(utf8, text.data(), text.size(),
                                             local->codePage == 0 ? utf8 : *local, name);
    if (!converted.supported) {
        converted = Converter::convert(utf8, text.data(), text.size(), utf8, name);
    }
    text.resize(converted.written);
    return text;
}

/// Whether the agent has recorded the configuration's modification time, which is in seconds.
bool isTakenOver(const char* path) {
    struct stat status;
    const LogManager* const manager = pTheLogManager;
    return manager != nullptr && ::stat(path, &status) == 0 &&
           manager->isConfigTakenOver(status.st_mtime);
}

UnmonitoredLogs::Log logOf(const ConfigCheck::Line& line, bool isTakenOver) {
    UnmonitoredLogs::Log log{inUtf8(nameIn(line.text)), line.number, line.reason,
                             ConfigCheck::name(line.cause)};
    if (line.verdict == ConfigCheck::Verdict::ACCEPTED) {
        log.reason = "The agent has not read this line yet.";
        log.cause = "refresh";
        if (isTakenOver) {
            log.reason += " A refresh alone does not help: it takes the configuration for "
                          "unchanged, since its modification time, in whole seconds, is the one "
                          "that the agent has seen. Touch the configuration, then refresh.";
            log.cause = "touch";
        }
    }
    return log;
}

} // namespace

UnmonitoredLogs::Result UnmonitoredLogs::read() {
    TraceScope trace(anchor);
    const char* const path = std::getenv("ZRM_CONFIG_FILE");
    if (path == nullptr || *path == '\0') {
        return {};
    }
    Result result{path, {}, {}};
    if (const auto file = ConfigCheck::checkFile(path); !file) { // opening a pipe would block
        result.problem = file.error();
        return result;
    }
    std::ifstream stream(path, std::ios::binary);
    if (!stream) {
        result.problem = Problem{ErrorText(errno).text()};
        return result;
    }
    const std::string text{std::istreambuf_iterator<char>(stream), {}};
    std::set<std::string> monitored;
    for (const LogLedgerView& log : LogLedgers::read()) {
        monitored.insert(log.file);
    }
    result.logs = find(text, monitored, isTakenOver(path));
    return result;
}

std::vector<UnmonitoredLogs::Log> UnmonitoredLogs::find(std::string_view text,
                                                        const std::set<std::string>& monitored,
                                                        bool isTakenOver) {
    TraceScope trace(anchor);
    std::vector<Log> logs;
    for (const ConfigCheck::Line& line : ConfigCheck::check(others(text, monitored)).lines) {
        if (line.verdict == ConfigCheck::Verdict::IGNORED) {
            continue;
        }
        Log log = logOf(line, isTakenOver);
        const bool isKnown = std::any_of(logs.begin(), logs.end(),
                                         [&](const Log& other) { return other.log == log.log; });
        if (!isKnown) {
            logs.push_back(std::move(log));
        }
    }
    return logs;
}

void UnmonitoredLogs::Log::write(JsonWriter& json) const {
    json.beginObject().member("log", log).member("line", line);
    json.member("reason", reason).member("cause", cause).endObject();
}

void UnmonitoredLogs::Result::writeConfiguration(JsonWriter& json) const {
    if (file.empty()) {
        json.null();
    } else {
        json.beginObject()
            .member("file", file)
            .textOrNull("problem", problem ? problem->text() : "")
            .endObject();
    }
}

} // namespace zrm::host
