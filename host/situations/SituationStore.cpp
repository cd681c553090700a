#include "host/situations/SituationStore.h"

#include "base/TraceScope.h"
#include "host/base/TimeText.h"
#include "host/base/WholeFile.h"
#include "host/config/SituationValidator.h"
#include "host/situations/SituationJson.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <ctime>
#include <map>
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
constexpr const char* untilNextStart =
    "; situations cannot be changed through the API until the next start";

/// The contents of the file. A pipe in its place does not block.
Result<std::string, int> contentOf(const std::string& path) {
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    if (fd == -1) {
        return tl::unexpected(errno);
    }
    Result<std::string, int> text = WholeFile::read(fd, largestFile);
    close(fd);
    return text;
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
    text.context = object.value("context", std::int64_t{0});
    text.runbook = optionalText(object, "runbook");
    text.labels = object.value("labels", std::map<std::string, std::string>());
    text.mayHaveBraces = true; // it may have been made before braces had a meaning
    text.judgement.groupBy = object.value("group_by", std::vector<std::string>());
    if (object.contains("max_groups")) {
        text.judgement.maxGroups = object.at("max_groups").get<std::int64_t>();
    }
    text.judgement.distinct = optionalText(object, "distinct");
    text.judgement.then = optionalText(object, "then");
    text.judgement.resolveAfter = optionalText(object, "resolve_after");
    text.judgement.cooldown = optionalText(object, "cooldown");
    text.judgement.absent = optionalText(object, "absent");
    SituationStore::Made made;
    made.isStopped = object.at("stopped").get<bool>();
    auto [config, problems] = SituationValidator::check(text, patterns.ofNext());
    for (const SituationProblem& problem : problems) {
        made.problem += (made.problem.empty() ? "" : "; ") + problem.field + ": " + problem.text();
    }
    patterns.spend(config.patternSize);
    made.config = std::move(config);
    return made;
}

/// Reads the text of a file.
Result<Content> parse(const std::string& text) {
    try {
        const json document = documentOf(text);
        if (const json& number = document.at("version"); number != version) {
            return refused("its version is " + number.dump() + ", this agent's is " +
                           std::to_string(version));
        }
        Content content;
        std::set<std::string> names;
        PatternBudget patterns(PatternBudget::ofSource);
        for (const json& object : document.at("situations")) {
            content.made.push_back(madeFrom(object, patterns));
            if (!names.insert(content.made.back().config.name).second) {
                return refused("a name appears twice");
            }
        }
        content.stoppedFiles = document.at("stopped").get<std::vector<std::string>>();
        return content;
    } catch (const TooDeep&) {
        return refused("it is nested too deeply");
    } catch (const json::exception&) {
        return refused("it is damaged");
    }
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

Content SituationStore::load() {
    TraceScope trace(anchor);
    if (m_path.empty()) {
        return {};
    }
    Content content;
    const Result<std::string, int> text = contentOf(m_path);
    if (text) {
        Result<Content> read = parse(*text);
        if (read) {
            return std::move(*read);
        }
        content.message = moveAside(read.error().text());
    } else if (text.error() != ENOENT) {
        m_blocked = Problem{because("cannot read " + m_path, text.error())};
        content.message = m_blocked->text() + untilNextStart;
    }
    return content;
}

std::string SituationStore::moveAside(const std::string& reason) {
    TraceScope trace(anchor);
    const std::time_t now = WallClock::seconds();
    std::tm local{};
    localtime_r(&now, &local);
    char stamp[32];
    std::strftime(stamp, sizeof stamp, ".bad-%Y%m%d-%H%M%S", &local);
    const std::string aside = m_path + stamp;
    if (std::rename(m_path.c_str(), aside.c_str()) != 0) {
        m_blocked = Problem{because("cannot move " + m_path + " aside", errno)};
        return m_path + " cannot be used (" + reason + "); " + m_blocked->text() + untilNextStart;
    }
    return m_path + " cannot be used (" + reason + ") and was moved to " + aside +
           "; the agent continues without the situations that were created through the API";
}

Result<void> SituationStore::save(const Content& content) {
    TraceScope trace(anchor);
    if (m_path.empty()) {
        return {};
    }
    if (m_blocked) {
        return tl::unexpected(*m_blocked);
    }
    const std::string text = SituationJson::text(jsonOf(content)) + '\n';
    const Result<void> saved =
        text.size() <= largestFile
            ? replace(text)
            : refused("they have " + std::to_string(text.size()) + " bytes, and at most " +
                      std::to_string(largestFile) + " can be read again");
    if (!saved) {
        trace.error()("The situations cannot be saved: %s.", saved.error().text().c_str());
    }
    return saved;
}

Result<void> SituationStore::replace(std::string_view text) const {
    const std::string directory = m_path.substr(0, m_path.rfind('/'));
    if (mkdir(directory.c_str(), 0750) == -1 && errno != EEXIST) {
        return refused(because("cannot create the directory " + directory, errno));
    }
    const std::string temporary = m_path + ".new";
    unlink(temporary.c_str()); // left by an agent that was killed, or anything else
    const int fd = open(temporary.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, fileMode);
    if (fd == -1) {
        return refused(because("cannot create " + temporary, errno));
    }
    Result<void, int> written = WholeFile::write(fd, text);
    if (close(fd) == -1 && written) {
        written = tl::unexpected(errno);
    }
    Result<void> replaced;
    if (!written) {
        replaced = refused(because("cannot write " + temporary, written.error()));
    } else if (std::rename(temporary.c_str(), m_path.c_str()) != 0) {
        replaced = refused(because("cannot replace " + m_path, errno));
    }
    if (replaced) {
        syncDirectory(directory);
    } else {
        unlink(temporary.c_str());
    }
    return replaced;
}

} // namespace zrm::host
