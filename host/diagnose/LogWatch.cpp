#include "host/diagnose/LogWatch.h"

#include "base/TraceScope.h"
#include "host/base/TimeText.h"
#include "host/diagnose/LogWarnings.h"

#include <algorithm>
#include <condition_variable>
#include <mutex>
#include <optional>
#include <system_error>
#include <thread>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"LogWatch.cpp"};

using Warnings = std::map<std::string, std::vector<LogWarning>>;

/// When a warning began, according to the previous check.
std::optional<std::int64_t> beginOf(const Warnings& before, const std::string& log,
                                    const std::string& kind) {
    const auto found = before.find(log);
    if (found == before.end()) {
        return std::nullopt;
    }
    const auto same = std::find_if(found->second.begin(), found->second.end(),
                                   [&](const LogWarning& one) { return one.kind == kind; });
    return same == found->second.end() ? std::nullopt : std::optional(same->since);
}

/// Whether the log's thread has reported the same.
bool isTraced(const LogLedgerView& log, const LogWarning& warning) {
    return warning.kind == "failing" && log.follow && !log.follow->problem.empty();
}

} // namespace

struct LogWatch::Shared {
    std::mutex mutex; ///< guards the members below
    std::condition_variable changed;
    bool isEnded = false;
    std::optional<std::vector<LogLedgerView>> logs; ///< logs to check
    Warnings warnings;
    std::map<std::string, LogHealth> healths;

    Announce announce; ///< used by the thread
};

LogWatch::LogWatch(Announce announce) : m_shared(std::make_shared<Shared>()) {
    m_shared->announce = std::move(announce);
}

LogWatch::~LogWatch() {
    const std::lock_guard guard(m_shared->mutex);
    m_shared->isEnded = true;
    m_shared->changed.notify_all();
}

void LogWatch::tick(Clock::time_point now,
                    const std::function<std::vector<LogLedgerView>()>& read) {
    TraceScope trace(anchor);
    if (now < m_next || !begin()) {
        return;
    }
    {
        const std::lock_guard guard(m_shared->mutex);
        if (m_shared->logs) {
            return; // a file system blocks the previous check
        }
    }
    m_next = now + interval;
    std::vector<LogLedgerView> logs = read();
    const std::lock_guard guard(m_shared->mutex);
    m_shared->logs = std::move(logs);
    m_shared->changed.notify_all();
}

/// Starts the thread; tries again later if none can be started now.
bool LogWatch::begin() {
    if (!m_hasThread) {
        try {
            std::thread(run, m_shared).detach();
            m_hasThread = true;
        } catch (const std::system_error&) {
            return false;
        }
    }
    return true;
}

void LogWatch::run(const std::shared_ptr<Shared>& shared) {
    std::unique_lock lock(shared->mutex);
    for (;;) {
        shared->changed.wait(lock, [&] { return shared->isEnded || shared->logs; });
        if (shared->isEnded) {
            return;
        }
        const std::vector<LogLedgerView> logs = *shared->logs;
        const Warnings before = shared->warnings;
        lock.unlock();
        Warnings found;
        std::vector<std::string> lines;
        for (const LogLedgerView& log : logs) {
            std::vector<LogWarning> warnings = LogWarnings::of(log);
            warnings.insert(warnings.end(), log.warnings.begin(), log.warnings.end());
            for (LogWarning& warning : warnings) {
                const std::optional<std::int64_t> begin = beginOf(before, log.log, warning.kind);
                warning.since = begin.value_or(WallClock::now());
                if (!begin && !isTraced(log, warning)) {
                    lines.push_back(log.log + ": " + warning.text);
                }
            }
            if (!warnings.empty()) {
                found.emplace(log.log, std::move(warnings));
            }
        }
        lock.lock();
        if (shared->isEnded) {
            return;
        }
        shared->warnings = std::move(found);
        shared->healths.clear();
        for (const LogLedgerView& log : logs) {
            if (log.health) {
                shared->healths.emplace(log.log, *log.health);
            }
        }
        shared->logs.reset();
        lock.unlock();
        for (const std::string& line : lines) {
            shared->announce(line);
        }
        lock.lock();
    }
}

std::vector<LogWarning> LogWatch::of(const std::string& log) const {
    const std::lock_guard guard(m_shared->mutex);
    const auto found = m_shared->warnings.find(log);
    return found == m_shared->warnings.end() ? std::vector<LogWarning>() : found->second;
}

std::optional<LogHealth> LogWatch::healthOf(const std::string& log) const {
    const std::lock_guard guard(m_shared->mutex);
    const auto found = m_shared->healths.find(log);
    return found == m_shared->healths.end() ? std::nullopt : std::optional(found->second);
}

std::map<std::string, std::vector<LogWarning>> LogWatch::all() const {
    const std::lock_guard guard(m_shared->mutex);
    return m_shared->warnings;
}

} // namespace zrm::host
