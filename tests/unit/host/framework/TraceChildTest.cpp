#include "framework/trace.h"

#include "base/TraceScope.h"
#include "host/framework/TraceControl.h"
#include "support/ReasonOf.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <memory>
#include <regex>
#include <string>
#include <thread>
#include <vector>

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

using namespace zrm;
using namespace zrm::host;

namespace {

TRC1_Anchor anchor{"TraceChildTest.cpp"};

/// Waits for the child; kills it and returns false when it hangs.
bool ends(pid_t child) {
    const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    int status = 0;
    while (std::chrono::steady_clock::now() < limit) {
        if (waitpid(child, &status, WNOHANG) == child) {
            return WIFEXITED(status) && WEXITSTATUS(status) == 0;
        }
        std::this_thread::yield();
    }
    kill(child, SIGKILL);
    waitpid(child, &status, 0);
    return false;
}

int linesIn(const std::string& path, const std::regex& pattern) {
    std::ifstream file(path);
    int count = 0;
    for (std::string line; std::getline(file, line);) {
        EXPECT_TRUE(std::regex_match(line, pattern)) << line;
        ++count;
    }
    return count;
}

// Threads that repeatedly hold each lock that a careless trace would take: those of the
// allocator, of the time zone, of the environment, of stdio, and of a change of the trace itself.
class BusyLocks {
public:
    BusyLocks() {
        run([] {
            auto block = std::make_unique<std::vector<char>>(300000);
            block->resize(600000);
        });
        run([] {
            const std::time_t now = std::time(nullptr);
            std::tm parts{};
            localtime_r(&now, &parts);
            tzset();
            mktime(&parts);
        });
        run([] { std::fflush(stderr); });
        run([] {
            std::FILE* const sink = std::fopen("/dev/null", "w");
            std::fprintf(sink, "%f %s", 1.5, "text");
            std::fclose(sink);
        });
        run([] {
            TraceControl::configure("error+detail");
            std::this_thread::yield();
        });
    }
    ~BusyLocks() {
        m_done = true;
        for (std::thread& thread : m_threads) {
            thread.join();
        }
        TraceControl::configure("");
    }

private:
    template <typename Action> void run(Action action) {
        m_threads.emplace_back([this, action] {
            while (!m_done) {
                action();
            }
        });
    }
    std::atomic<bool> m_done{false};
    std::vector<std::thread> m_threads;
};

TEST(TraceChild, TracesWhicheverLockAnotherThreadHeldAtTheFork) {
    constexpr int children = 100;
    TemporaryDirectory directory;
    ASSERT_EQ(reasonOf(TraceControl::openFile(directory.file("trace"))), "");
    TRC1_Printf(anchor, 1, "parent %d", 0);
    {
        // Standard error's lock is held throughout.
        flockfile(stderr);
        const BusyLocks busy;
        for (int index = 0; index < children; ++index) {
            const pid_t child = fork();
            if (child == 0) {
                TRC1_Sync(anchor);
                TraceScope trace(anchor);
                trace.error()("child %d of %s: %.20s %ld", index, "the parent", "text", 7L);
                _exit(0);
            }
            const bool ended = ends(child);
            if (!ended) {
                funlockfile(stderr);
            }
            ASSERT_TRUE(ended) << "child " << index << " hangs";
        }
        funlockfile(stderr);
    }
    ASSERT_EQ(reasonOf(TraceControl::openFile("")), "");
    EXPECT_EQ(
        linesIn(directory.file("trace"), std::regex("\\S+ \\S+ \\d+ TraceChildTest.cpp:\\d+ "
                                                    "(parent 0|child \\d+ of the parent: text 7)")),
        children + 1);
}

TEST(TraceChild, LeavesAMovedFileToTheParent) {
    TemporaryDirectory directory;
    ASSERT_EQ(reasonOf(TraceControl::openFile(directory.file("trace"))), "");
    TRC1_Printf(anchor, 1, "parent");
    ASSERT_EQ(std::rename(directory.file("trace").c_str(), directory.file("trace.1").c_str()), 0);
    const pid_t child = fork();
    if (child == 0) {
        const auto second = std::time(nullptr);
        while (std::time(nullptr) == second) {
        }
        TRC1_Printf(anchor, 1, "child");
        _exit(0);
    }
    ASSERT_TRUE(ends(child));
    ASSERT_EQ(reasonOf(TraceControl::openFile("")), "");
    EXPECT_FALSE(std::filesystem::exists(directory.file("trace")));
    EXPECT_EQ(linesIn(directory.file("trace.1"), std::regex(".*:1 (parent|child)")), 2);
}

} // namespace
