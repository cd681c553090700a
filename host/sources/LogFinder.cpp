#include "host/sources/LogFinder.h"

#include "base/ErrorText.h"
#include "host/base/Utf8.h"
#include "host/config/NamedTextFormat.h"
#include "host/config/PathPattern.h"
#include "host/events/PositionBook.h"
#include "host/sources/NamedSources.h"
#include "host/sources/PathSearch.h"
#include "host/sources/RotationOrigins.h"
#include "monitor/GenerationNames.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <string_view>
#include <tuple>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::array<std::string_view, 5> compressedEnds = {".gz", ".xz", ".zst", ".bz2", ".lz4"};

bool isCompressed(std::string_view name) {
    return std::any_of(compressedEnds.begin(), compressedEnds.end(),
                       [name](std::string_view end) { return name.ends_with(end); });
}

} // namespace

/// A path that is named or matched.
struct LogFinder::Candidate {
    std::string name;
    std::size_t source;
    bool isNamed;            ///< by itself, not by a glob
    const std::string* path; ///< of the configuration, that names or matches it
    bool isThere = false;
    Identity identity{};
    std::int64_t size = 0; ///< bytes
    bool isNewcomer = false;
    int rank = 0; ///< the lowest first
};

/// The work of one look.
class LogFinder::Look {
public:
    Look(LogFinder& finder, const std::vector<LogConfig>& logs,
         const std::map<std::string, std::string>& ownFiles, Clock::time_point now)
        : m_finder(finder), m_logs(logs), m_now(now) {
        for (const auto& [path, what] : ownFiles) {
            struct stat status;
            if (::stat(path.c_str(), &status) == 0) {
                m_ownFiles.emplace(Identity{status.st_dev, status.st_ino}, what);
            }
        }
    }

    FoundLogs run() {
        m_found.sources.resize(m_logs.size());
        if (!m_finder.m_hasLooked) {
            takeUp();
        } else if (hasNewPaths()) {
            m_finder.m_earlier.noteWatched(*PositionBook::current());
        }
        collect();
        std::vector<Candidate> candidates;
        for (Candidate& candidate : m_candidates) {
            if (isUsable(candidate)) {
                candidate.rank = rankOf(candidate);
                candidates.push_back(std::move(candidate));
            }
        }
        // Who is followed already stays; of new ones, those that are named come first.
        std::stable_sort(candidates.begin(), candidates.end(),
                         [](const Candidate& a, const Candidate& b) { return a.rank < b.rank; });
        for (Candidate& candidate : candidates) {
            m_names.insert(candidate.name);
        }
        std::vector<Candidate> chosen;
        for (Candidate& candidate : candidates) {
            if (isChosen(candidate, chosen.size())) {
                chosen.push_back(std::move(candidate));
            }
        }
        std::sort(chosen.begin(), chosen.end(), [](const Candidate& a, const Candidate& b) {
            return std::tie(a.source, a.name) < std::tie(b.source, b.name);
        });
        list(chosen);
        remember(chosen);
        addNamedSources(m_logs, m_found);
        return std::move(m_found);
    }

private:
    /// Before the first look: logs that lost their name after the last run have not been read to
    /// their ends.
    void takeUp() {
        for (const std::string& log : m_finder.m_earlier.renamedLogs(m_logs)) {
            const LogPosition& position = m_finder.m_earlier.positions().at(log);
            m_finder.m_known.emplace(
                log, Known{Identity{position.device, position.inode}, m_now, false});
        }
    }

    bool hasNewPaths() const {
        return std::any_of(m_logs.begin(), m_logs.end(), [this](const LogConfig& log) {
            return std::any_of(log.paths.begin(), log.paths.end(), [this](const auto& path) {
                return !m_finder.m_searched.contains(path);
            });
        });
    }

    void collect() {
        for (std::size_t index = 0; index < m_logs.size(); ++index) {
            FoundLogs::Source& source = m_found.sources[index];
            source.line = m_logs[index].line;
            source.format = m_logs[index].formatName;
            source.paths = m_logs[index].paths;
            for (const std::string& path : m_logs[index].paths) {
                if (!PathPattern::isPattern(path)) {
                    add({path, index, true, &path});
                    continue;
                }
                PathSearch search(path);
                source.problem = search.problem.empty() ? source.problem : search.problem;
                const bool isNew = m_finder.m_searched.contains(path);
                for (std::string& name : search.paths) {
                    Candidate candidate{std::move(name), index, false, &path};
                    candidate.isNewcomer = isNew && !m_finder.m_leftOut.contains(candidate.name);
                    add(std::move(candidate));
                }
                keepAbsent(path, index);
            }
        }
    }

    /// A followed file that the glob does not match at this moment.
    void keepAbsent(const std::string& pattern, std::size_t index) {
        for (const auto& [name, known] : m_finder.m_known) {
            if (m_now - known.seen < keptAbsent && !m_sourceOf.contains(name) &&
                PathPattern::matches(pattern, name)) {
                add({name, index, false, &pattern});
            }
        }
    }

    void add(Candidate candidate) {
        const LogConfig& log = m_logs[candidate.source];
        const bool isExcluded =
            std::any_of(log.excludes.begin(), log.excludes.end(), [&](const auto& pattern) {
                return PathPattern::excludes(pattern, candidate.name);
            });
        if (isExcluded) {
            m_leftOut.insert(std::move(candidate.name));
            return;
        }
        const auto [first, isFirst] = m_sourceOf.emplace(candidate.name, candidate.source);
        if (isFirst) {
            m_candidates.push_back(std::move(candidate));
        } else if (first->second != candidate.source) {
            passOver(candidate, "The [[log]] at line " +
                                    std::to_string(m_logs[first->second].line) +
                                    " names it, too, and applies");
        }
    }

    bool isUsable(Candidate& candidate) {
        if (Utf8::validPrefix(candidate.name) != candidate.name.size()) {
            return passOver(candidate, "Its name is not UTF-8");
        }
        if (!candidate.isNamed && isCompressed(candidate.name)) {
            return passOver(candidate, "It is compressed");
        }
        if (const LogConfig& log = m_logs[candidate.source]; log.letter == 'U') {
            if (const auto usable = checkNamedTextFormat(log.format, candidate.name); !usable) {
                return passOver(candidate, "Its format " + usable.error().text());
            }
        }
        struct stat status;
        if (::stat(candidate.name.c_str(), &status) != 0) {
            const ErrorText error(errno);
            const bool isGone = error.number() == ENOENT || error.number() == ENOTDIR;
            const bool isKept = candidate.isNamed || m_finder.m_known.contains(candidate.name);
            candidate.isNewcomer = candidate.isNewcomer || isGone; // once it is there
            return isKept || passOver(candidate, isGone ? "It is a link that leads nowhere"
                                                        : std::string("It cannot be looked at: ") +
                                                              error.text());
        }
        if (!S_ISREG(status.st_mode)) {
            // What a followed log was is read to its end, and its state says what has its name.
            return m_finder.m_known.contains(candidate.name) ||
                   passOver(candidate, S_ISDIR(status.st_mode) ? "It is a directory"
                                                               : "It is not a regular file");
        }
        candidate.isThere = true;
        if (!m_finder.m_searched.contains(*candidate.path)) {
            candidate.isNewcomer =
                m_logs[candidate.source].follow.resume &&
                m_finder.m_earlier.isNewSince(*candidate.path, candidate.name, status);
        }
        candidate.identity = {status.st_dev, status.st_ino};
        candidate.size = status.st_size;
        if (const auto own = m_ownFiles.find(candidate.identity); own != m_ownFiles.end()) {
            m_leftOut.insert(candidate.name);
            return passOver(candidate, "It is " + own->second +
                                           ", to which the agent itself writes: each event would "
                                           "raise the next");
        }
        return true;
    }

    int rankOf(const Candidate& candidate) const {
        if (m_finder.m_known.contains(candidate.name)) {
            return 0;
        }
        return candidate.isNamed ? 1 : 2;
    }

    /// The log of which the file is an older generation; empty if there is none. A generation that
    /// was passed over remains one when its log is gone: what it has was read as that log's.
    std::string logOf(const Candidate& candidate) const {
        if (candidate.isNamed) {
            return "";
        }
        const auto& stored = m_finder.m_earlier.positions();
        const bool isOld = !m_finder.m_hasLooked && !candidate.isNewcomer &&
                           m_logs[candidate.source].follow.resume &&
                           !stored.contains(candidate.name);
        for (std::string& origin : originsOf(candidate.name)) {
            if (m_names.contains(origin) || m_finder.m_known.contains(origin) ||
                m_finder.m_generations.contains({candidate.identity, origin}) ||
                (isOld && stored.contains(origin))) {
                return std::move(origin);
            }
        }
        return "";
    }

    bool isChosen(const Candidate& candidate, std::size_t chosen) {
        if (const std::string log = logOf(candidate); !log.empty()) {
            m_generations.emplace(candidate.identity, log);
            return passOver(candidate, "It is an older generation of " + log);
        }
        if (candidate.isThere && !isFirstName(candidate)) {
            return false;
        }
        if (chosen >= mostFiles) {
            m_found.sources[candidate.source].problem =
                "More than " + std::to_string(mostFiles) +
                " files match; name the files more narrowly";
            return passOver(candidate, "There are too many files");
        }
        return true;
    }

    /// True if the file is where the generations of the log are looked for.
    bool isWhereRotated(const Candidate& candidate, const std::string& log) const {
        const std::string directory = candidate.name.substr(0, candidate.name.rfind('/') + 1);
        const std::string& rotatedTo = m_logs[m_sourceOf.at(log)].follow.rotatedTo;
        return directory == log.substr(0, log.rfind('/') + 1) ||
               directory == rotationDirectory(log, rotatedTo);
    }

    /// The name under which the file was followed until it was renamed; empty if there is none.
    std::string formerName(const Candidate& candidate) const {
        for (const auto& [name, known] : m_finder.m_known) {
            if (known.identity == candidate.identity) {
                return name;
            }
        }
        const auto rotated = m_finder.m_rotated.find(candidate.name);
        if (rotated != m_finder.m_rotated.end() && rotated->second.identity == candidate.identity) {
            return rotated->second.former;
        }
        if (m_finder.m_hasLooked || m_finder.m_earlier.positions().contains(candidate.name)) {
            return "";
        }
        std::string earlier = m_finder.m_earlier.logOf(candidate.name, candidate.identity);
        return m_names.contains(earlier) && isWhereRotated(candidate, earlier) ? earlier : "";
    }

    /// False if the file is, or was until it was rotated, followed under another name.
    bool isFirstName(const Candidate& candidate) {
        const auto [same, isFirst] = m_identities.emplace(candidate.identity, candidate.name);
        if (!isFirst) {
            return passOver(candidate, "It is the same file as " + same->second);
        }
        if (m_finder.m_known.contains(candidate.name) || candidate.isNamed) {
            return true;
        }
        const std::string former = formerName(candidate);
        if (former.empty() || isWrittenOn(candidate)) {
            return true;
        }
        m_rotated.emplace(candidate.name, Rotated{candidate.identity, former});
        m_found.renamed.emplace(candidate.identity, candidate.name);
        // Its log is read to the end of this file, and is kept for a while.
        return passOver(candidate, m_names.contains(former)
                                       ? "It was followed under another name before it was rotated"
                                       : "It was followed as " + former +
                                             " until it was renamed, and is followed again once it "
                                             "is written to");
    }

    /// True if the file has grown since the log under whose name it was followed has left it.
    static bool isWrittenOn(const Candidate& candidate) {
        const auto left = PositionBook::current()->takenOver(candidate.name);
        return left && Identity{left->device, left->inode} == candidate.identity &&
               left->offset < candidate.size;
    }

    /// Always false.
    bool passOver(const Candidate& candidate, std::string reason) {
        m_found.sources[candidate.source].passOver(candidate.name, std::move(reason));
        return false;
    }

    void list(std::vector<Candidate>& chosen) {
        std::vector<std::array<std::shared_ptr<const FollowSettings>, 2>> settings(m_logs.size());
        for (Candidate& candidate : chosen) {
            const LogConfig& log = m_logs[candidate.source];
            const auto known = m_finder.m_known.find(candidate.name);
            if (known != m_finder.m_known.end()) {
                candidate.isNewcomer = known->second.isNewcomer;
            }
            // What was read as a line of the log configuration is not read again.
            candidate.isNewcomer = candidate.isNewcomer && !FurtherLogs::isLeftOut(candidate.name);
            auto& shared = settings[candidate.source][candidate.isNewcomer ? 1 : 0];
            if (shared == nullptr) {
                auto own = std::make_shared<FollowSettings>(log.follow);
                own->isNewcomer = candidate.isNewcomer;
                shared = std::move(own);
            }
            m_found.logs.push_back(
                {candidate.name, log.letter, log.debug ? 'Y' : 'N', log.format, shared});
            m_found.sources[candidate.source].files.push_back(candidate.name);
        }
    }

    void remember(const std::vector<Candidate>& chosen) {
        std::map<std::string, Known> known;
        for (const Candidate& candidate : chosen) {
            const auto before = m_finder.m_known.find(candidate.name);
            Known now{candidate.isThere ? std::optional(candidate.identity) : std::nullopt, m_now,
                      candidate.isNewcomer};
            if (!candidate.isThere && before != m_finder.m_known.end()) {
                now.identity = before->second.identity;
                now.seen = before->second.seen;
            }
            known.emplace(candidate.name, now);
        }
        m_finder.m_hasLooked = true;
        m_finder.m_known = std::move(known);
        m_finder.m_rotated = std::move(m_rotated);
        m_finder.m_generations = std::move(m_generations);
        m_finder.m_leftOut = std::move(m_leftOut);
        m_finder.m_searched.clear();
        for (const LogConfig& log : m_logs) {
            m_finder.m_searched.insert(log.paths.begin(), log.paths.end());
        }
    }

    LogFinder& m_finder;
    const std::vector<LogConfig>& m_logs;
    const Clock::time_point m_now;
    FoundLogs m_found;
    std::vector<Candidate> m_candidates;
    std::map<std::string, std::size_t> m_sourceOf; ///< of each candidate's name
    std::set<std::string> m_names;
    std::map<Identity, std::string> m_identities;
    std::map<Identity, std::string> m_ownFiles;
    std::map<std::string, Rotated> m_rotated;
    std::set<std::pair<Identity, std::string>> m_generations;
    std::set<std::string> m_leftOut;
};

FoundLogs LogFinder::look(const std::vector<LogConfig>& logs,
                          const std::map<std::string, std::string>& ownFiles,
                          Clock::time_point now) {
    return Look(*this, logs, ownFiles, now).run();
}

} // namespace zrm::host
