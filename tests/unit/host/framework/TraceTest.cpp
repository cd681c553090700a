#include "framework/trace.h"

#include "base/TraceScope.h"
#include "host/framework/TraceControl.h"
#include "support/ReasonOf.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <fstream>
#include <regex>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include <pthread.h>
#include <sched.h>
#include <sys/socket.h>
#include <unistd.h>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

TRC1_Anchor anchor{"TraceTest.cpp"};

/// Replaces standard error. Each write becomes one message, so that the tests see what was
/// written in one piece.
class ErrorSocket {
public:
    ErrorSocket() : m_saved(dup(STDERR_FILENO)) {
        EXPECT_EQ(socketpair(AF_UNIX, SOCK_SEQPACKET, 0, m_ends), 0);
        dup2(m_ends[1], STDERR_FILENO);
    }
    ~ErrorSocket() {
        dup2(m_saved, STDERR_FILENO);
        close(m_saved);
        close(m_ends[0]);
        close(m_ends[1]);
    }
    /// The messages written so far.
    std::vector<std::string> take() {
        std::vector<std::string> result;
        std::vector<char> buffer(65536);
        ssize_t size;
        while ((size = recv(m_ends[0], buffer.data(), buffer.size(), MSG_DONTWAIT)) > 0) {
            result.emplace_back(buffer.data(), static_cast<std::size_t>(size));
        }
        return result;
    }
    /// The texts of the records written so far.
    std::vector<std::string> takeTexts() {
        std::vector<std::string> result;
        for (const std::string& record : take()) {
            std::smatch parts;
            EXPECT_TRUE(std::regex_match(record, parts, std::regex("(\\S+ ){4}([^]*)\n")))
                << record;
            result.push_back(parts[2]);
        }
        return result;
    }

private:
    int m_saved;
    int m_ends[2] = {-1, -1};
};

/// The exact time; time() may lag behind it.
std::time_t now() {
    std::timespec moment{};
    clock_gettime(CLOCK_REALTIME, &moment);
    return moment.tv_sec;
}

TEST(Trace, ARecordHasTimeThreadPlaceAndText) {
    ErrorSocket errors;
    const std::time_t before = now();
    TRC1_Printf(anchor, 42, "log %s has %d lines", "/var/log/messages", 7);
    const std::time_t after = now();
    const auto records = errors.take();
    ASSERT_EQ(records.size(), 1u) << "one record is one write";
    std::smatch parts;
    ASSERT_TRUE(
        std::regex_match(records[0], parts,
                         std::regex("(\\d{4}-\\d\\d-\\d\\d \\d\\d:\\d\\d:\\d\\d)\\.\\d{6} (\\d+) "
                                    "TraceTest\\.cpp:42 log /var/log/messages has 7 lines\n")))
        << records[0];
    std::tm time{};
    time.tm_isdst = -1;
    strptime(parts[1].str().c_str(), "%Y-%m-%d %H:%M:%S", &time);
    const std::time_t written = mktime(&time);
    EXPECT_GE(written, before);
    EXPECT_LE(written, after);
    EXPECT_EQ(parts[2], std::to_string(gettid()));
}

TEST(Trace, ARecordEndsWithExactlyOneNewline) {
    ErrorSocket errors;
    TRC1_Printf(anchor, 1, "%s", "");
    TRC1_Printf(anchor, 1, "text\n");
    TRC1_Printf(anchor, 1, "\ntwo\nlines");
    EXPECT_THAT(errors.takeTexts(), ElementsAre("", "text", "\ntwo\nlines"));
}

TEST(Trace, ALongRecordIsCutAndKeepsItsNewline) {
    ErrorSocket errors;
    for (const std::size_t size : {16000u, 16384u, 16385u, 100000u}) {
        const std::string text(size, 'x');
        TRC1_Printf(anchor, 1, "%s", text.c_str());
        const auto records = errors.take();
        ASSERT_EQ(records.size(), 1u);
        const std::string& record = records[0];
        if (size == 16000) {
            EXPECT_TRUE(record.ends_with(' ' + text + '\n'));
        } else {
            EXPECT_EQ(record.size(), 16384u);
            EXPECT_TRUE(record.ends_with("xx\n"));
        }
    }
}

TEST(Trace, EventsShowEntryExitAndResult) {
    ErrorSocket errors;
    TRC1_Event(anchor, 1, TRC1_ENTRY);
    TRC1_Event(anchor, 1, TRC1_EXIT);
    TRC1_Event(anchor, 1, TRC1_EXIT_VALUE, -1);
    EXPECT_THAT(errors.takeTexts(), ElementsAre("Entry", "Exit", "Exit: -1"));
}

TEST(Trace, LeavesErrnoAsItWas) {
    TemporaryDirectory directory;
    errno = ENOTTY;
    {
        ErrorSocket errors;
        errno = ENOTTY;
        TRC1_Printf(anchor, 1, "text");
        EXPECT_EQ(errno, ENOTTY);
    }
    const int saved = dup(STDERR_FILENO);
    close(STDERR_FILENO);
    errno = ENOTTY;
    TRC1_Printf(anchor, 1, "text"); // cannot be written
    const int seen = errno;
    dup2(saved, STDERR_FILENO);
    close(saved);
    EXPECT_EQ(seen, ENOTTY);
}

TEST(Trace, AChangedLevelAppliesFromTheNextOperation) {
    ErrorSocket errors;
    const auto traced = [&errors] {
        {
            TraceScope trace(anchor);
            trace.error()("error");
            trace.detail()("detail");
            trace.fine()("fine");
        }
        return errors.takeTexts();
    };
    ASSERT_EQ(reasonOf(TraceControl::configure("")), "");
    EXPECT_THAT(traced(), ElementsAre("error"));
    ASSERT_EQ(reasonOf(TraceControl::configure("detail+fine")), "");
    EXPECT_THAT(traced(), ElementsAre("detail", "fine"));
    ASSERT_EQ(reasonOf(TraceControl::configure("none,TraceTest=flow")), "");
    EXPECT_THAT(traced(), ElementsAre("Entry", "Exit"));
    ASSERT_EQ(reasonOf(TraceControl::configure("all,TraceTest.cpp=none")), "");
    EXPECT_THAT(traced(), IsEmpty());
    ASSERT_EQ(reasonOf(TraceControl::configure("")), "");
    EXPECT_THAT(traced(), ElementsAre("error"));
}

// Threads that learn the level while it changes may do so in any order; none may leave an older
// level behind under the latest generation.
TEST(Trace, NoThreadRestoresAnOlderLevel) {
    static TRC1_Anchor shared{"Shared.cpp"};
    constexpr int threadCount = 3;
    constexpr int rounds = 1500;
    std::atomic<int> round{0};
    std::atomic<int> finished{0};
    std::vector<std::thread> threads;
    for (int i = 0; i < threadCount; ++i) {
        threads.emplace_back([&] {
            for (int next = 1; next <= rounds; ++next) {
                while (round < next) {
                    std::this_thread::yield();
                }
                TRC1_Sync(shared);
                TRC1_Sync(shared);
                ++finished;
            }
        });
    }
    int latest = 0;
    for (int next = 1; next <= rounds; ++next) {
        const unsigned level = static_cast<unsigned>(next) % 256;
        round = next;
        ASSERT_EQ(reasonOf(TraceControl::configure(std::to_string(level))), "");
        while (finished < next * threadCount) {
            std::this_thread::yield();
        }
        if (shared.generation == TRC1_Generation) {
            ++latest;
            ASSERT_EQ(shared.level, level) << "round " << next;
        }
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_GT(latest, 0);
    ASSERT_EQ(reasonOf(TraceControl::configure("")), "");
    EXPECT_EQ(TRC1_Sync(shared), 0x80u);
    EXPECT_EQ(shared.level, 0x80u);
    EXPECT_EQ(shared.generation, TRC1_Generation.load());
}

std::atomic<bool> g_cancelled{false};
std::atomic<bool> g_wentOn{false};

/// Has no objects of its own: a sanitizer would not notice that the unwind has left their frame.
void* traceOnceCancelled(void* /*unused*/) {
    while (!g_cancelled) {
        sched_yield();
    }
    TRC1_Printf(anchor, 1, "written all the same");
    g_wentOn = true;
    pthread_testcancel();
    return nullptr;
}

// A thread that is cancelled while it traces ends at its next cancellation point, and its record is
// written: an unwind through the trace would end the process.
TEST(Trace, IsNotACancellationPoint) {
    ErrorSocket errors;
    pthread_t thread{};
    ASSERT_EQ(pthread_create(&thread, nullptr, traceOnceCancelled, nullptr), 0);
    pthread_cancel(thread);
    g_cancelled = true;
    void* result = nullptr;
    pthread_join(thread, &result);
    EXPECT_TRUE(g_wentOn);
    EXPECT_EQ(result, PTHREAD_CANCELED);
    EXPECT_THAT(errors.takeTexts(), ElementsAre("written all the same"));
}

TEST(Trace, RecordsOfManyThreadsStayWhole) {
    TemporaryDirectory directory;
    ASSERT_EQ(reasonOf(TraceControl::openFile(directory.file("trace"))), "");
    constexpr int threadCount = 16;
    constexpr int recordCount = 200;
    std::vector<std::thread> threads;
    for (int index = 0; index < threadCount; ++index) {
        threads.emplace_back([index] {
            for (int record = 0; record < recordCount; ++record) {
                const std::string text(static_cast<std::size_t>(record * 7),
                                       static_cast<char>('a' + index));
                TRC1_Printf(anchor, index, "%d <%s>", record, text.c_str());
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    ASSERT_EQ(reasonOf(TraceControl::openFile("")), "");
    std::ifstream file(directory.file("trace"));
    std::vector<int> next(threadCount, 0);
    int lines = 0;
    for (std::string line; std::getline(file, line); ++lines) {
        std::istringstream words(line);
        std::string date, time, thread, place, text;
        int record = -1;
        words >> date >> time >> thread >> place >> record >> text;
        ASSERT_EQ(place.rfind("TraceTest.cpp:", 0), 0u) << line;
        const auto index = std::stoul(place.substr(14));
        ASSERT_EQ(record, next.at(index)++) << "a thread's records are in order";
        const std::string content(static_cast<std::size_t>(record * 7),
                                  static_cast<char>('a' + index));
        ASSERT_EQ(text, '<' + content + '>');
    }
    EXPECT_EQ(lines, threadCount * recordCount);
}

} // namespace
