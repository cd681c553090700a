#include "host/framework/TraceOutput.h"

#include "host/framework/TraceControl.h"
#include "support/Faults.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <thread>

#include <sys/stat.h>
#include <unistd.h>

using namespace zrm::host;

namespace {

namespace fs = std::filesystem;

class TraceOutputTest : public testing::Test {
protected:
    ~TraceOutputTest() override { TraceOutput::open(""); }

    std::string contentOf(const std::string& name) const {
        std::ifstream stream(directory.file(name), std::ios::binary);
        return {std::istreambuf_iterator<char>(stream), {}};
    }
    /// Writes as if this many seconds had passed since the test began.
    void write(std::string_view record, std::time_t second = 0) {
        TraceOutput::write(record, m_start + second);
    }
    TemporaryDirectory directory;

private:
    static inline std::time_t s_next = 1000;
    std::time_t m_start = s_next += 1000;
};

TEST_F(TraceOutputTest, AppendsToTheFile) {
    directory.write("trace", "before\n");
    ASSERT_EQ(TraceOutput::open(directory.file("trace").c_str()), 0);
    write("one\n");
    write("two\n");
    EXPECT_EQ(contentOf("trace"), "before\none\ntwo\n");
}

TEST_F(TraceOutputTest, DoesNotFollowALink) {
    directory.write("target", "kept\n");
    const std::string link = directory.file("trace");
    ASSERT_EQ(symlink(directory.file("target").c_str(), link.c_str()), 0);
    EXPECT_EQ(TraceOutput::open(link.c_str()), ELOOP);
    const auto opened = TraceControl::openFile(link);
    ASSERT_FALSE(opened);
    EXPECT_EQ(opened.error().text(),
              link + " is a symbolic link, which is not followed; name the file itself");
    // Nor does a file that was opened before go on there.
    unlink(link.c_str());
    ASSERT_EQ(TraceOutput::open(link.c_str()), 0);
    write("one\n");
    ASSERT_EQ(rename(link.c_str(), directory.file("moved").c_str()), 0);
    ASSERT_EQ(symlink(directory.file("target").c_str(), link.c_str()), 0);
    write("two\n", 5);
    EXPECT_EQ(contentOf("target"), "kept\n");
    EXPECT_EQ(contentOf("moved"), "one\ntwo\n");
}

TEST_F(TraceOutputTest, CreatesAFileThatOthersCannotRead) {
    const mode_t before = umask(0);
    ASSERT_EQ(TraceOutput::open(directory.file("trace").c_str()), 0);
    umask(before);
    struct stat status {};
    ASSERT_EQ(stat(directory.file("trace").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777, 0640u);
}

TEST_F(TraceOutputTest, CreatesTheFileAgainWhenItWasMovedAway) {
    ASSERT_EQ(TraceOutput::open(directory.file("trace").c_str()), 0);
    write("one\n", 1);
    fs::rename(directory.file("trace"), directory.file("trace.1"));
    write("same second\n", 1);
    write("next second\n", 2);
    write("later\n", 3);
    EXPECT_EQ(contentOf("trace.1"), "one\nsame second\n");
    EXPECT_EQ(contentOf("trace"), "next second\nlater\n");
}

TEST_F(TraceOutputTest, UsesAnotherFileInItsPlace) {
    ASSERT_EQ(TraceOutput::open(directory.file("trace").c_str()), 0);
    write("one\n", 1);
    directory.write("new", "made by the rotation\n");
    fs::rename(directory.file("new"), directory.file("trace"));
    write("two\n", 2);
    EXPECT_EQ(contentOf("trace"), "made by the rotation\ntwo\n");
}

TEST_F(TraceOutputTest, ContinuesInTheOldFileWhileANewOneCannotBeCreated) {
    ASSERT_EQ(TraceOutput::open(directory.file("trace").c_str()), 0);
    write("one\n", 1);
    fs::rename(directory.file("trace"), directory.file("trace.1"));
    {
        Fault fault("open", EMFILE);
        write("two\n", 2);
        EXPECT_EQ(fault.failed(), 1);
    }
    write("three\n", 3);
    EXPECT_EQ(contentOf("trace.1"), "one\ntwo\n");
    EXPECT_EQ(contentOf("trace"), "three\n");
}

TEST_F(TraceOutputTest, KeepsTheFileWhenItCannotBeExamined) {
    ASSERT_EQ(TraceOutput::open(directory.file("trace").c_str()), 0);
    Fault fault("stat", EACCES);
    write("one\n", 1);
    EXPECT_EQ(fault.failed(), 1);
    EXPECT_EQ(contentOf("trace"), "one\n");
}

TEST_F(TraceOutputTest, AFileThatCannotBeOpenedChangesNothing) {
    ASSERT_EQ(TraceOutput::open(directory.file("trace").c_str()), 0);
    EXPECT_EQ(TraceOutput::open(directory.file("missing/trace").c_str()), ENOENT);
    write("one\n");
    EXPECT_EQ(contentOf("trace"), "one\n");
}

TEST_F(TraceOutputTest, SwitchesToAnotherFileAndClosesTheFirst) {
    ASSERT_EQ(TraceOutput::open(directory.file("first").c_str()), 0);
    write("one\n");
    const auto descriptors = [] {
        return std::distance(fs::directory_iterator("/proc/self/fd"), fs::directory_iterator());
    };
    const auto before = descriptors();
    for (int round = 0; round < 10; ++round) {
        ASSERT_EQ(TraceOutput::open(directory.file("second").c_str()), 0);
    }
    write("two\n");
    EXPECT_EQ(descriptors(), before);
    EXPECT_EQ(contentOf("first"), "one\n");
    EXPECT_EQ(contentOf("second"), "two\n");
}

TEST_F(TraceOutputTest, LosesNothingWhenTheFileIsMovedWhileThreadsWrite) {
    ASSERT_EQ(TraceOutput::open(directory.file("trace").c_str()), 0);
    std::atomic<int> second{1};
    std::atomic<int> written{0};
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&] {
            while (second < 30) {
                write("record\n", second);
                ++written;
            }
        });
    }
    for (int move = 1; move < 30; ++move) {
        std::error_code ignored;
        fs::rename(directory.file("trace"), directory.file("trace." + std::to_string(move)),
                   ignored);
        ++second;
        const int seen = written;
        while (written < seen + 20) {
            std::this_thread::yield();
        }
        if (second == 29) {
            break;
        }
    }
    second = 30;
    for (std::thread& thread : threads) {
        thread.join();
    }
    std::size_t total = 0;
    for (const auto& entry : fs::directory_iterator(directory.path())) {
        total += contentOf(entry.path().filename()).size();
    }
    EXPECT_EQ(total, 7 * static_cast<std::size_t>(written));
    EXPECT_GT(std::distance(fs::directory_iterator(directory.path()), fs::directory_iterator()), 5);
}

} // namespace
