#include "host/diagnose/ConfigCheck.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "host/diagnose/FormatTrial.h"
#include "host/diagnose/LogWarnings.h"
#include "host/framework/TraceCapture.h"
#include "logs/LogManagerUtil.h"
#include "logs/ValidLog.h"
#include "logtypes/UserLogFile.h"
#include "parser/StringParser.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <memory>
#include <optional>
#include <utility>

#include <nlohmann/json.hpp>
#include <sys/stat.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"ConfigCheck.cpp"};

using Line = ConfigCheck::Line;
using Verdict = ConfigCheck::Verdict;
using Cause = ConfigCheck::Cause;

/// Every line of the text, until the agent's reading shows that it is more than a comment.
std::vector<Line> linesOf(std::string_view text) {
    std::vector<Line> lines;
    while (!text.empty()) {
        const std::size_t end = text.find('\n');
        const bool isEnded = end != std::string_view::npos;
        Line line{lines.size() + 1, std::string(text.substr(0, end)), Verdict::IGNORED, "", "",
                  Cause::NONE};
        const bool isBlank = line.text.find_first_not_of(" \t\v\f\r") == std::string::npos;
        if (!isBlank && line.text[0] != '#') {
            line.verdict = Verdict::REFUSED;
            line.cause = Cause::TEXT;
            line.reason = !isEnded ? "The file ends without a newline behind this line, so the "
                                     "agent does not read it."
                                   : "The agent passes over this line: it, or the line before it, "
                                     "has more than 1023 characters or a NUL character.";
        }
        lines.push_back(std::move(line));
        text.remove_prefix(isEnded ? end + 1 : text.size());
    }
    return lines;
}

/// Whether the file is in one of the directories by its name, in which nothing leads elsewhere.
bool isWithin(std::string_view path, const ConfigCheck::Directories& directories) {
    std::string directory;
    while (!path.empty()) {
        const std::size_t length = path.find('/');
        const std::string_view name = path.substr(0, length);
        if (name == "." || name == "..") {
            return false;
        }
        if (length == std::string_view::npos) {
            break;
        }
        directory += name;
        directory += !name.empty() || directory.empty() ? "/" : ""; // "//" is "/"
        path.remove_prefix(length + 1);
    }
    return directories.contains(directory);
}

/// The valid logs so far, on one chain.
class Chain {
public:
    /// `directories` is null where every file may be looked at.
    explicit Chain(const ConfigCheck::Directories* directories) : m_directories(directories) {}

    /// Judges one record, which is changed.
    void judge(char* record, Line& line) {
        const std::string log(record, std::strcspn(record, "\t "));
        line.log = log[0] == '/' ? log : "";
        line.reason.clear();
        line.cause = Cause::NONE;
        if (m_directories != nullptr && log[0] == '/' && !isWithin(log, *m_directories)) {
            line.verdict = Verdict::OUTSIDE;
            line.reason = "The file is outside the directories of the configured logs; zrmctl "
                          "check checks it on the agent's machine.";
            return;
        }
        TraceCapture errors;
        auto valid = std::make_unique<ValidLog>(CONFIG_USER, record,
                                                m_logs.empty() ? nullptr : m_logs.front().get());
        line.reason = errors.take();
        line.verdict = valid->isValid() ? Verdict::ACCEPTED : Verdict::REFUSED;
        if (valid->isValid() && valid->type() == 'U') {
            learnFormat(*valid, errors, line);
        }
        warnOfContents(*valid, line);
        const zrm::host::Result<void> file =
            log[0] == '/' ? ConfigCheck::checkFile(log) : zrm::host::Result<void>();
        if (line.verdict == Verdict::REFUSED && !file) {
            line.cause = Cause::FILE;
            line.reason = "The file cannot be used: " + file.error().text() + ".";
        } else if (line.verdict == Verdict::REFUSED) {
            line.cause = Cause::TEXT;
        }
        if (valid->isValid()) {
            valid->LogBase::setLogProcedure(nullptr); // the chain is there for the names
            m_logs.push_back(std::move(valid));
        }
    }

private:
    static void learnFormat(const ValidLog& log, TraceCapture& errors, Line& line) {
        const std::size_t length = std::strlen(log.procedure());
        if (length > ConfiguredFormat::mostInLine) {
            line.verdict = Verdict::REFUSED;
            line.reason = ConfiguredFormat::tooLong(length);
            return;
        }
        const StringParser format(log.procedure(), UserLogFile::fields());
        if (format.status() != OBJECT_FORMAT_LEARNED) {
            line.verdict = Verdict::REFUSED;
            const std::string learning = errors.take();
            line.reason += line.reason.empty() || learning.empty() ? "" : " ";
            line.reason += learning;
            line.reason += line.reason.empty() ? "" : " ";
            line.reason += "Error occurred while interpreting format command for file " +
                           std::string(log.fileNameLocal()) + "; monitoring not started. ";
        }
    }
    /// An accepted log whose file does not look like one of its type gets a warning.
    static void warnOfContents(const ValidLog& log, Line& line) {
        std::optional<std::string> warning;
        if (log.isValid() && log.type() == 'S') {
            warning = LogWarnings::ofSyslogFile(log.fileNameLocal());
        } else if (log.isValid() && log.type() == 'A') {
            warning = LogWarnings::ofAccountingFile(log.fileNameLocal());
        }
        if (warning) {
            line.reason += (line.reason.empty() ? "" : " ") + *warning;
        }
    }

    const ConfigCheck::Directories* m_directories;
    std::vector<std::unique_ptr<ValidLog>> m_logs;
};

ConfigCheck::Result judge(std::string_view text, const ConfigCheck::Directories* directories) {
    ConfigCheck::Result result{linesOf(text), 0, 0};
    std::string content(text); // the stream keeps to it
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> stream(
        content.empty() ? nullptr : fmemopen(content.data(), content.size(), "r"), std::fclose);
    if (stream != nullptr) {
        Chain chain(directories);
        std::array<char, LogManagerUtil::recordSize> room;
        std::size_t read = 0;
        std::size_t newlines = 0;
        while (char* const record = LogManagerUtil::nextRecord(stream.get(), room.data())) {
            const auto position = static_cast<std::size_t>(std::ftell(stream.get()));
            newlines += static_cast<std::size_t>(
                std::count(content.begin() + static_cast<std::ptrdiff_t>(read),
                           content.begin() + static_cast<std::ptrdiff_t>(position), '\n'));
            read = position;
            chain.judge(record, result.lines.at(newlines - 1));
        }
    }
    for (const Line& line : result.lines) {
        result.accepted += line.verdict == Verdict::ACCEPTED ? 1 : 0;
        result.refused += line.verdict == Verdict::REFUSED ? 1 : 0;
    }
    return result;
}

} // namespace

ConfigCheck::Result ConfigCheck::check(std::string_view text) {
    TraceScope trace(anchor);
    return judge(text, nullptr);
}

ConfigCheck::Result ConfigCheck::check(std::string_view text, const Directories& directories) {
    TraceScope trace(anchor);
    return judge(text, &directories);
}

zrm::host::Result<void> ConfigCheck::checkFile(const std::string& path) {
    struct stat status;
    if (::stat(path.c_str(), &status) != 0) {
        return refused(ErrorText(errno).text());
    }
    if (!S_ISREG(status.st_mode)) {
        return refused("It is not a regular file");
    }
    if (status.st_mtime == 0) {
        return refused("It was changed last at the beginning of 1970, which is how the agent "
                       "recognises a missing file");
    }
    return {};
}

const char* ConfigCheck::name(Verdict verdict) noexcept {
    constexpr const char* names[] = {"accepted", "refused", "ignored", "outside"};
    return names[static_cast<std::size_t>(verdict)];
}

const char* ConfigCheck::name(Cause cause) noexcept {
    constexpr const char* names[] = {nullptr, "text", "file"};
    return names[static_cast<std::size_t>(cause)];
}

std::string ConfigCheck::json(const Result& result) {
    using Json = nlohmann::ordered_json;
    const auto orNull = [](const std::string& text) { return text.empty() ? Json() : Json(text); };
    Json lines = Json::array();
    for (const Line& line : result.lines) {
        const char* const cause = name(line.cause);
        lines.push_back({{"line", line.number},
                         {"text", line.text},
                         {"verdict", name(line.verdict)},
                         {"log", orNull(line.log)},
                         {"reason", orNull(line.reason)},
                         {"cause", cause != nullptr ? Json(cause) : Json()}});
    }
    const Json object{{"lines", lines}, {"accepted", result.accepted}, {"refused", result.refused}};
    return object.dump(-1, ' ', false, Json::error_handler_t::replace);
}

} // namespace zrm::host
