#include "host/sources/LogList.h"

#include "host/base/TimeText.h"
#include "host/events/PositionBook.h"
#include "logs/FollowSettings.h"
#include "monitor/FileOwners.h"

#include <algorithm>
#include <condition_variable>
#include <mutex>
#include <system_error>
#include <thread>
#include <utility>

namespace zrm::host {

namespace {

/// The first looks follow each other quickly, so that the history soon knows what is watched.
constexpr int quickLooks = 5;

bool isSame(const FurtherLog& a, const FurtherLog& b) {
    return a.name == b.name && a.type == b.type && a.debugMode == b.debugMode &&
           a.procedure == b.procedure && *a.settings == *b.settings;
}

struct Latest {
    std::mutex mutex; ///< guards what was found
    std::shared_ptr<const FoundLogs> found = std::make_shared<const FoundLogs>();
};

/// Never destroyed: threads that outlive main may use it.
Latest& latest() {
    static auto* const theLatest = new Latest;
    return *theLatest;
}

std::shared_ptr<const FoundLogs> exchange(std::shared_ptr<const FoundLogs> found) {
    const std::lock_guard guard(latest().mutex);
    return std::exchange(latest().found, std::move(found));
}

/// The files in which logs have positions that nobody follows yet.
std::vector<FileOwners::Expected> expectedFiles(const FoundLogs& found) {
    const PositionBook& book = *PositionBook::current();
    const std::map<std::string, LogPosition> positions = book.positions();
    std::set<PositionBook::File> read;
    for (const auto& [log, position] : positions) {
        read.emplace(position.device, position.inode);
    }
    std::vector<FileOwners::Expected> expected;
    for (const FurtherLog& log : found.logs) {
        const auto position = positions.find(log.name);
        if (position == positions.end() || book.isFollowed(log.name)) {
            continue;
        }
        expected.emplace_back(log.name, position->second);
        for (const LogPosition& late : position->second.late.files()) {
            if (!read.contains({late.device, late.inode})) { // else it is that log's
                expected.emplace_back(log.name, late);
            }
        }
    }
    return expected;
}

void publish(const FoundLogs& found) {
    FileOwners::ofProcess().expect(expectedFiles(found));
    FurtherLogs::publish(std::make_shared<const FurtherLogs::List>(found.logs));
}

} // namespace

struct LogList::Shared {
    /// The thread looks soon.
    void ask() {
        const std::lock_guard guard(mutex);
        isAsked = true;
        changed.notify_all();
    }

    std::mutex mutex; ///< guards the members below
    std::condition_variable changed;
    bool isEnded = false;
    bool isAsked = false; ///< the tables have changed since the last look
    bool isUsed = false;  ///< there are tables, or were since the start
    std::vector<LogConfig> logs;
    OwnFiles ownFiles;

    LogFinder finder; ///< used by the thread, and before it starts
    std::function<void()> announce;
    std::chrono::seconds interval;
};

LogList::LogList(std::function<void()> changed, std::chrono::seconds interval)
    : m_shared(std::make_shared<Shared>()) {
    m_shared->announce = std::move(changed);
    m_shared->interval = interval;
}

LogList::~LogList() {
    FurtherLogs::setOnRefresh(nullptr);
    const std::lock_guard guard(m_shared->mutex);
    m_shared->isEnded = true;
    m_shared->changed.notify_all();
}

void LogList::begin(const std::vector<LogConfig>& logs, OwnFiles ownFiles,
                    std::set<std::string> monitored) {
    apply(logs, std::move(ownFiles));
    m_shared->finder = LogFinder(EarlierRun(*PositionBook::current(), std::move(monitored)));
    if (logs.empty()) {
        return;
    }
    const std::lock_guard guard(m_shared->mutex);
    m_shared->isAsked = false;
    auto found = std::make_shared<const FoundLogs>(
        m_shared->finder.look(m_shared->logs, m_shared->ownFiles, LogFinder::Clock::now()));
    PositionBook::current()->setRenamed(found->renamed);
    exchange(found);
    publish(*found);
}

bool LogList::start() {
    try {
        std::thread(run, m_shared).detach();
        FurtherLogs::setOnRefresh([shared = m_shared] { shared->ask(); });
    } catch (const std::system_error&) {
        return false;
    }
    return true;
}

void LogList::apply(const std::vector<LogConfig>& logs, OwnFiles ownFiles) {
    const std::lock_guard guard(m_shared->mutex);
    m_shared->logs = logs;
    m_shared->ownFiles = std::move(ownFiles);
    m_shared->isUsed = m_shared->isUsed || !logs.empty();
    m_shared->isAsked = true;
    m_shared->changed.notify_all();
}

std::shared_ptr<const FoundLogs> LogList::found() {
    const std::lock_guard guard(latest().mutex);
    return latest().found;
}

void LogList::run(const std::shared_ptr<Shared>& shared) {
    std::unique_lock lock(shared->mutex);
    for (int looks = 0;;) {
        const std::chrono::milliseconds interval = shared->interval;
        shared->changed.wait_for(lock, looks < quickLooks ? interval / quickLooks : interval,
                                 [&] { return shared->isEnded || shared->isAsked; });
        if (shared->isEnded) {
            return;
        }
        shared->isAsked = false;
        if (!shared->isUsed) {
            continue;
        }
        ++looks;
        const std::vector<LogConfig> logs = shared->logs;
        const OwnFiles ownFiles = shared->ownFiles;
        lock.unlock();
        const std::int64_t time = WallClock::now();
        auto found = std::make_shared<const FoundLogs>(
            shared->finder.look(logs, ownFiles, LogFinder::Clock::now()));
        lock.lock();
        if (shared->isEnded) {
            return;
        }
        EarlierRun::noteLook(*PositionBook::current(), logs, *found, time);
        PositionBook::current()->setRenamed(found->renamed);
        const auto before = exchange(found);
        const bool isPublished = FurtherLogs::published() != nullptr;
        lock.unlock();
        if (!isPublished || !std::equal(before->logs.begin(), before->logs.end(),
                                        found->logs.begin(), found->logs.end(), isSame)) {
            publish(*found);
            shared->announce();
        }
        lock.lock();
    }
}

} // namespace zrm::host
