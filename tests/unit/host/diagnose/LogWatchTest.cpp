#include "host/diagnose/LogWatch.h"

#include "support/TemporaryDirectory.h"

#include <chrono>
#include <filesystem>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include <gmock/gmock.h>
#include <sys/stat.h>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

class LogWatchTest : public testing::Test {
protected:
    LogWatchTest() {
        struct stat status {};
        EXPECT_EQ(stat(m_path.c_str(), &status), 0);
        m_log.log = m_log.file = m_path;
        m_log.openFile = FileIdentity{status.st_dev, status.st_ino};
    }
    void tick() {
        m_now += LogWatch::interval;
        m_watch.tick(m_now, [this] {
            ++m_looks;
            return std::vector<LogLedgerView>{m_log};
        });
    }
    /// Ticks until the log has so many warnings; false after ten seconds.
    bool waitFor(std::size_t count) {
        const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(10);
        while (m_watch.of(m_path).size() != count) {
            if (std::chrono::steady_clock::now() > limit) {
                return false;
            }
            tick();
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        return true;
    }
    std::vector<std::string> announced() {
        const std::lock_guard guard(m_mutex);
        return m_lines;
    }

    TemporaryDirectory m_directory;
    std::string m_path = m_directory.write("app.log", "");
    LogLedgerView m_log;
    LogWatch::Clock::time_point m_now = LogWatch::Clock::now();
    int m_looks = 0;
    std::mutex m_mutex;
    std::vector<std::string> m_lines;
    LogWatch m_watch{[this](const std::string& line) {
        const std::lock_guard guard(m_mutex);
        m_lines.push_back(line);
    }};
};

TEST_F(LogWatchTest, DoesNotAnnounceAFailureThatTheLogsThreadHasReported) {
    m_log.follow = FollowView{};
    m_log.follow->problem = "open failed and is tried again: Permission denied";
    ASSERT_TRUE(waitFor(1));
    m_log.follow->problem.clear();
    ASSERT_TRUE(waitFor(0));
    EXPECT_THAT(announced(), IsEmpty());
}

TEST_F(LogWatchTest, ChecksAtMostOncePerInterval) {
    for (int i = 0; i < 5; ++i) {
        m_watch.tick(m_now, [this] {
            ++m_looks;
            return std::vector<LogLedgerView>();
        });
    }
    EXPECT_EQ(m_looks, 1);
}

TEST_F(LogWatchTest, KeepsAWarningAsLongAsItAppliesAndReportsItOnce) {
    EXPECT_THAT(m_watch.all(), IsEmpty());
    std::filesystem::rename(m_path, m_directory.file("app.log.1"));
    ASSERT_TRUE(waitFor(1));
    const std::int64_t since = m_watch.of(m_path)[0].since;
    EXPECT_GT(since, 0);
    const int looks = m_looks;
    while (m_looks < looks + 3) { // each begins behind the end of the one before
        tick();
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    EXPECT_EQ(m_watch.all().at(m_path)[0].kind, "missing");
    EXPECT_EQ(m_watch.of(m_path)[0].since, since);
    EXPECT_THAT(announced(), ElementsAre(HasSubstr(m_path + ": No file has this log's name")));
    std::filesystem::rename(m_directory.file("app.log.1"), m_path);
    ASSERT_TRUE(waitFor(0));
    EXPECT_THAT(m_watch.all(), IsEmpty());
    EXPECT_THAT(announced(), SizeIs(1));
}

} // namespace
