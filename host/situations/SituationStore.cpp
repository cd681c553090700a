#include "host/situations/SituationStore.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "host/config/SituationValidator.h"
#include "host/situations/SituationJson.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <ctime>
#include <optional>
#include <set>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SituationStore.cpp"};

using nlohmann::json;
using Content = SituationStore::Content;

constexpr int version = 1;
constexpr int deepest = 8;                             ///< the deepest nesting of the file
constexpr std::size_t largestFile = 128 * 1024 * 1024; ///< bytes
constexpr mode_t fileMode = 0640;

std::string because(const std::string& what, int number) {
    const ErrorText error(number);
    return what + ": " + error.text();
}

/// Writes and syncs the whole text; false with errno set.
bool writeAll(int fd, std::string_view text) {
    while (!text.empty()) {
        const ssize_t written = write(fd, text.data(), text.size());
        if (written == -1 && errno != EINTR) {
            return false;
        }
        text.remove_prefix(static_cast<std::size_t>(std::max<ssize_t>(written, 0)));
    }
    return fsync(fd) == 0;
}

/// Reads the whole file; returns 0 or errno. A pipe in place of the file does not block.
int readAll(const std::string& path, std::string& text) {
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    if (fd == -1) {
        return errno;
    }
    char buffer[65536];
    ssize_t count = 0;
    while (text.size() <= largestFile &&
           ((count = read(fd, buffer, sizeof buffer)) > 0 || (count == -1 && errno == EINTR))) {
        text.append(buffer, static_cast<std::size_t>(std::max<ssize_t>(count, 0)));
    }
    const int number = count == -1 ? errno : text.size() > largestFile ? EFBIG : 0;
    close(fd);
    return number;
}

struct TooDeep {};

/// Parses a text. The parser accepts any depth, but its result is copied and printed recursively.
json documentOf(const std::string& text) {
    return json::parse(text, [](int depth, json::parse_event_t, const json&) {
        return depth <= deepest ? true : throw TooDeep();
    });
}

/// A rename is durable only once its directory has been synced.
void syncDirectory(const std::string& directory) {
    const int fd = open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd != -1) {
        fsync(fd);
        close(fd);
    }
}

/// A member that may be a text, null or missing; anything else throws.
std::optional<std::string> optionalText(const json& object, const char* key) {
    const auto found = object.find(key);
    if (found == object.end() || found->is_null()) {
        return std::nullopt;
    }
    return found->get<std::string>();
}

SituationStore::Made madeFrom(const json& object, PatternBudget& patterns) {
    SituationText text;
    text.name = object.at("name").get<std::string>();
    text.text = optionalText(object, "text");
    text.severity = optionalText(object, "severity");
    text.log = optionalText(object, "log");
    text.when = object.at("when").get<std::vector<std::string>>();
    text.frequency = optionalText(object, "frequency");
    text.period = optionalText(object, "period");
    SituationStore::Made made;
    made.isStopped = object.at("stopped").get<bool>();
    for (const SituationProblem& problem :
         SituationValidator::check(text, made.config, patterns.ofNext())) {
        made.problem += (made.problem.empty() ? "" : "; ") + problem.fieldText() + ": " +
                        problem.what + "; " + problem.cure;
    }
    patterns.spend(made.config.patternSize);
    return made;
}

/// The content in a file's text; `reason` says why there is none.
std::optional<Content> contentOf(const std::string& text, std::string& reason) {
    try {
        const json document = documentOf(text);
        if (const json& number = document.at("version"); number != version) {
            reason =
                "its version is " + number.dump() + ", this agent's is " + std::to_string(version);
            return std::nullopt;
        }
        Content content;
        std::set<std::string> names;
        PatternBudget patterns(PatternBudget::ofSource);
        for (const json& object : document.at("situations")) {
            content.made.push_back(madeFrom(object, patterns));
            if (!names.insert(content.made.back().config.name).second) {
                reason = "a name appears twice";
                return std::nullopt;
            }
        }
        content.stoppedFiles = document.at("stopped").get<std::vector<std::string>>();
        return content;
    } catch (const TooDeep&) {
        reason = "it is nested too deeply";
    } catch (const json::exception&) {
        reason = "it is damaged";
    }
    return std::nullopt;
}

nlohmann::ordered_json jsonOf(const Content& content) {
    nlohmann::ordered_json document = {{"version", version},
                                       {"situations", nlohmann::ordered_json::array()},
                                       {"stopped", content.stoppedFiles}};
    for (const SituationStore::Made& made : content.made) {
        nlohmann::ordered_json object = SituationJson::definition(made.config);
        object["stopped"] = made.isStopped;
        document["situations"].push_back(std::move(object));
    }
    return document;
}

} // namespace

Content SituationStore::load(std::string& message) {
    TraceScope trace(anchor);
    if (m_path.empty()) {
        return {};
    }
    std::string text;
    if (const int number = readAll(m_path, text); number == ENOENT) {
        return {};
    } else if (number != 0) {
        m_blocked = because("cannot read " + m_path, number);
        message = m_blocked + "; situations cannot be changed through the API until the next start";
        return {};
    }
    std::string reason;
    if (std::optional<Content> content = contentOf(text, reason)) {
        return std::move(*content);
    }
    message = moveAside(reason);
    return {};
}

std::string SituationStore::moveAside(const std::string& reason) {
    TraceScope trace(anchor);
    const std::time_t now = std::time(nullptr);
    std::tm local{};
    localtime_r(&now, &local);
    char stamp[32];
    std::strftime(stamp, sizeof stamp, ".bad-%Y%m%d-%H%M%S", &local);
    const std::string aside = m_path + stamp;
    if (std::rename(m_path.c_str(), aside.c_str()) != 0) {
        m_blocked = because("cannot move " + m_path + " aside", errno);
        return m_path + " cannot be used (" + reason + "); " + m_blocked +
               "; situations cannot be changed through the API until the next start";
    }
    return m_path + " cannot be used (" + reason + ") and was moved to " + aside +
           "; the agent continues without the situations that were created through the API";
}

std::string SituationStore::save(const Content& content) {
    TraceScope trace(anchor);
    if (m_path.empty()) {
        return "";
    }
    if (!m_blocked.empty()) {
        return m_blocked;
    }
    const std::string text = SituationJson::text(jsonOf(content)) + '\n';
    std::string problem = text.size() <= largestFile
                              ? replace(text)
                              : "they have " + std::to_string(text.size()) +
                                    " bytes, and at most " + std::to_string(largestFile) +
                                    " can be read again";
    if (!problem.empty()) {
        trace.error()("The situations cannot be saved: %s.", problem.c_str());
    }
    return problem;
}

std::string SituationStore::replace(std::string_view text) const {
    const std::string directory = m_path.substr(0, m_path.rfind('/'));
    if (mkdir(directory.c_str(), 0750) == -1 && errno != EEXIST) {
        return because("cannot create the directory " + directory, errno);
    }
    const std::string temporary = m_path + ".new";
    unlink(temporary.c_str()); // left by an agent that was killed, or anything else
    const int fd = open(temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, fileMode);
    if (fd == -1) {
        return because("cannot create " + temporary, errno);
    }
    std::string problem;
    if (!writeAll(fd, text)) {
        problem = because("cannot write " + temporary, errno);
    }
    if (close(fd) == -1 && problem.empty()) {
        problem = because("cannot write " + temporary, errno);
    }
    if (problem.empty() && std::rename(temporary.c_str(), m_path.c_str()) != 0) {
        problem = because("cannot replace " + m_path, errno);
    }
    if (!problem.empty()) {
        unlink(temporary.c_str());
        return problem;
    }
    syncDirectory(directory);
    return "";
}

} // namespace zrm::host
