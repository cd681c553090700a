#include "host/sinks/JsonlSink.h"

#include "support/Faults.h"
#include "support/TemporaryDirectory.h"
#include "unit/host/events/TestEvents.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <future>
#include <iterator>
#include <string>
#include <thread>
#include <utility>

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

using namespace zrm::host;

namespace {

std::string content(const std::string& path) {
    std::ifstream stream(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(stream), {}};
}

/// While it lives, no file of this process grows beyond this size.
class FileSizeLimit {
public:
    explicit FileSizeLimit(rlim_t bytes) {
        std::signal(SIGXFSZ, SIG_IGN);
        getrlimit(RLIMIT_FSIZE, &m_before);
        rlimit limit = m_before;
        limit.rlim_cur = bytes;
        setrlimit(RLIMIT_FSIZE, &limit);
    }
    ~FileSizeLimit() { setrlimit(RLIMIT_FSIZE, &m_before); }

private:
    rlimit m_before{};
};

class JsonlSinkTest : public testing::Test {
protected:
    JsonlSinkTest() {
        for (const char* const text : {"one", "two", "three"}) {
            events.add(text);
            lines += TestEvents::line(static_cast<int>(events.all().size()), text);
        }
    }
    std::span<const EventRecord> from(std::size_t first) {
        return std::span(events.records()).subspan(first);
    }

    TemporaryDirectory directory;
    std::string path = directory.file("events.jsonl");
    TestEvents events;
    std::string lines; ///< of all three events
    std::stop_source giveUp;
};

TEST_F(JsonlSinkTest, CreatesTheFileAndAppendsALinePerEvent) {
    JsonlSink sink(SinkConfig::jsonl(path));
    EXPECT_EQ(sink.name(), path);
    EXPECT_EQ(sink.deliver(from(0).first(1), giveUp.get_token()), 1u);
    EXPECT_EQ(sink.deliver(from(1), giveUp.get_token()), 2u);
    EXPECT_EQ(content(path), lines);
    struct stat status {};
    stat(path.c_str(), &status);
    EXPECT_EQ(status.st_mode & 0007, 0u) << "not every user may read events";
}

TEST_F(JsonlSinkTest, KeepsTheFilesContents) {
    directory.write("events.jsonl", "earlier\n");
    JsonlSink(SinkConfig::jsonl(path)).deliver(from(0), giveUp.get_token());
    EXPECT_EQ(content(path), "earlier\n" + lines);
}

TEST_F(JsonlSinkTest, ALineTornByAKilledAgentIsTerminated) {
    directory.write("events.jsonl", "earlier\n{\"id\":1,\"situ");
    JsonlSink(SinkConfig::jsonl(path)).deliver(from(0), giveUp.get_token());
    EXPECT_EQ(content(path), "earlier\n{\"id\":1,\"situ\n" + lines);
}

TEST_F(JsonlSinkTest, ATornLineThatCannotBeTerminatedIsAFailure) {
    directory.write("events.jsonl", "{\"id\":1");
    JsonlSink sink(SinkConfig::jsonl(path));
    {
        const FileSizeLimit limit(7);
        EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
        EXPECT_EQ(sink.error(), "write failed: File too large");
    }
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 3u);
    EXPECT_EQ(content(path), "{\"id\":1\n" + lines);
}

TEST_F(JsonlSinkTest, AFileThatBecomesADirectoryIsAFailureUntilItIsOneAgain) {
    JsonlSink sink(SinkConfig::jsonl(path));
    std::filesystem::create_directory(path);
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
    EXPECT_EQ(sink.error(), "open failed: Is a directory");
    std::filesystem::remove(path);
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 3u);
    EXPECT_EQ(content(path), lines);
}

TEST_F(JsonlSinkTest, ReopensAFileThatWasMovedOrRemoved) {
    const std::string removed = directory.file("removed.jsonl");
    JsonlSink movedSink(SinkConfig::jsonl(path));
    JsonlSink removedSink(SinkConfig::jsonl(removed));
    movedSink.deliver(from(0).first(1), giveUp.get_token());
    removedSink.deliver(from(0).first(1), giveUp.get_token());
    std::filesystem::rename(path, directory.file("events.jsonl.1"));
    std::filesystem::remove(removed);
    // The path is checked once a second; until then the open file is written.
    std::string expected = TestEvents::line(1, "one");
    std::string added;
    const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    while (!(std::filesystem::exists(path) && std::filesystem::exists(removed)) &&
           std::chrono::steady_clock::now() < limit) {
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
        EXPECT_EQ(movedSink.deliver(from(1).first(1), giveUp.get_token()), 1u);
        EXPECT_EQ(removedSink.deliver(from(1).first(1), giveUp.get_token()), 1u);
        added += TestEvents::line(2, "two");
    }
    EXPECT_EQ(content(directory.file("events.jsonl.1")) + content(path), expected + added);
    EXPECT_EQ(content(path), TestEvents::line(2, "two"));
    EXPECT_THAT(content(removed), testing::StartsWith(TestEvents::line(2, "two")));
}

TEST_F(JsonlSinkTest, AFileThatCannotBeOpenedIsAFailureUntilItCanBe) {
    const std::string inside = directory.file("later/events.jsonl");
    JsonlSink sink(SinkConfig::jsonl(inside));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
    EXPECT_EQ(sink.error(), "open failed: No such file or directory");
    std::filesystem::create_directory(directory.file("later"));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 3u);
    EXPECT_EQ(content(inside), lines);
}

TEST_F(JsonlSinkTest, AFullDeviceIsAFailure) {
    JsonlSink sink(SinkConfig::jsonl("/dev/full"));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
    EXPECT_EQ(sink.error(), "write failed: No space left on device");
}

TEST_F(JsonlSinkTest, AfterAFailedWriteTheRestIsWrittenOnce) {
    JsonlSink sink(SinkConfig::jsonl(path));
    {
        Fault fault("write", EIO);
        EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
        EXPECT_EQ(sink.error(), "write failed: Input/output error");
    }
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 3u);
    EXPECT_EQ(content(path), lines);
}

TEST_F(JsonlSinkTest, AnInterruptedWriteContinues) {
    JsonlSink sink(SinkConfig::jsonl(path));
    Fault fault("write", EINTR, {.times = 3});
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 3u);
    EXPECT_EQ(fault.failed(), 3);
    EXPECT_EQ(content(path), lines);
}

TEST_F(JsonlSinkTest, ATornLineIsRemovedAndWrittenInFullLater) {
    const std::size_t first = TestEvents::line(1, "one").size();
    JsonlSink sink(SinkConfig::jsonl(path));
    {
        const FileSizeLimit limit(first + 10);
        EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 1u);
        EXPECT_EQ(sink.error(), "write failed: File too large");
        EXPECT_EQ(content(path), TestEvents::line(1, "one"));
    }
    EXPECT_EQ(sink.deliver(from(1), giveUp.get_token()), 2u);
    EXPECT_EQ(content(path), lines);
}

TEST_F(JsonlSinkTest, ATornLineThatStaysIsCompletedInItsFile) {
    const std::size_t first = TestEvents::line(1, "one").size();
    JsonlSink sink(SinkConfig::jsonl(path));
    Fault fault("ftruncate", EPERM, {.times = -1});
    {
        const FileSizeLimit limit(first + 10);
        EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 1u);
        EXPECT_EQ(content(path), lines.substr(0, first + 10));
        // Nothing fits: nothing changes.
        EXPECT_EQ(sink.deliver(from(1), giveUp.get_token()), 0u);
    }
    std::filesystem::rename(path, directory.file("moved"));
    EXPECT_EQ(sink.deliver(from(1), giveUp.get_token()), 2u);
    EXPECT_EQ(content(directory.file("moved")), lines);
}

TEST_F(JsonlSinkTest, APipeThatNobodyReadsIsAFailureUntilSomebodyDoes) {
    ASSERT_EQ(mkfifo(path.c_str(), 0600), 0);
    JsonlSink sink(SinkConfig::jsonl(path));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
    EXPECT_EQ(sink.error(), "no process reads " + path + "; start its reader");
    const int reader = open(path.c_str(), O_RDONLY | O_NONBLOCK);
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 3u);
    std::string text(lines.size() + 1, '\0');
    text.resize(static_cast<std::size_t>(read(reader, text.data(), text.size())));
    EXPECT_EQ(text, lines);
    close(reader);
}

/// Standard output is a pipe while the test runs.
class JsonlSinkPipeTest : public JsonlSinkTest {
protected:
    JsonlSinkPipeTest() {
        std::signal(SIGPIPE, SIG_IGN); // the agent blocks it
        std::fflush(stdout);
        m_output = dup(STDOUT_FILENO);
        int ends[2];
        EXPECT_EQ(pipe(ends), 0);
        reader = ends[0];
        dup2(ends[1], STDOUT_FILENO);
        close(ends[1]);
    }
    ~JsonlSinkPipeTest() override {
        dup2(m_output, STDOUT_FILENO);
        close(m_output);
        if (reader != -1) {
            close(reader);
        }
    }
    std::string readAll() const {
        const int flags = fcntl(reader, F_GETFL);
        fcntl(reader, F_SETFL, flags | O_NONBLOCK);
        std::string text;
        char buffer[4096];
        ssize_t count = 0;
        while ((count = read(reader, buffer, sizeof buffer)) > 0) {
            text.append(buffer, static_cast<std::size_t>(count));
        }
        return text;
    }

    int reader = -1;

private:
    int m_output = -1;
};

TEST_F(JsonlSinkPipeTest, ADashIsStandardOutput) {
    JsonlSink sink(SinkConfig::jsonl("-"));
    EXPECT_EQ(sink.name(), "standard output");
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 3u);
    EXPECT_EQ(readAll(), lines);
}

TEST_F(JsonlSinkPipeTest, ReportsSinceWhenItsReaderTakesNothing) {
    JsonlSink sink(SinkConfig::jsonl("-"));
    EXPECT_EQ(sink.waitsSince(), std::nullopt);
    const auto begin = std::chrono::steady_clock::now();
    std::jthread writer([&] {
        while (sink.deliver(from(0), giveUp.get_token()) == 3) {
        }
    });
    while (!sink.waitsSince()) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    EXPECT_GE(*sink.waitsSince(), begin);
    giveUp.request_stop();
    writer.join();
    EXPECT_EQ(sink.waitsSince(), std::nullopt);
}

TEST_F(JsonlSinkTest, ALinkIsNotFollowed) {
    const std::string target = directory.file("target");
    ASSERT_EQ(symlink(target.c_str(), path.c_str()), 0);
    JsonlSink sink(SinkConfig::jsonl(path));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
    EXPECT_EQ(sink.error(),
              path + " is a symbolic link, which is not followed; name the file itself");
    EXPECT_FALSE(std::filesystem::exists(target));
    std::filesystem::remove(path);
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 3u);
}

TEST_F(JsonlSinkTest, AFileReplacedByALinkIsClosed) {
    JsonlSink sink(SinkConfig::jsonl(path));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 3u);
    std::filesystem::rename(path, directory.file("moved"));
    std::filesystem::create_symlink(directory.file("moved"), path);
    std::this_thread::sleep_for(std::chrono::milliseconds(1100)); // it checks once a second
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
    EXPECT_EQ(sink.error(),
              path + " is a symbolic link, which is not followed; name the file itself");
    EXPECT_EQ(content(directory.file("moved")), lines);
}

TEST_F(JsonlSinkPipeTest, WaitsForAReaderThatTakesNothingUntilGiveUp) {
    JsonlSink sink(SinkConfig::jsonl("-"));
    std::string expected;
    std::string written;
    std::jthread stopper;
    // The pipe takes some lines before it is full.
    std::size_t delivered = 3;
    while (delivered == 3) {
        if (!stopper.joinable() && expected.size() > 32768) {
            stopper = std::jthread([this] {
                std::this_thread::sleep_for(std::chrono::milliseconds(200));
                giveUp.request_stop();
            });
        }
        delivered = sink.deliver(from(0), giveUp.get_token());
        expected += lines;
    }
    EXPECT_EQ(sink.error(), "the reader does not read");
    written = readAll();
    EXPECT_TRUE(expected.starts_with(written));
    // When they are offered again, the rest follows where the stream was interrupted.
    const std::stop_source anew;
    EXPECT_EQ(sink.deliver(from(delivered), anew.get_token()), 3 - delivered);
    EXPECT_EQ(written + readAll(), expected);
}

TEST_F(JsonlSinkTest, AFileAsStandardOutputIsSharedWithOtherWriters) {
    std::fflush(stdout);
    const int output = dup(STDOUT_FILENO);
    const int file = ::open(path.c_str(), O_WRONLY | O_CREAT, 0600); // not for appending
    dup2(file, STDOUT_FILENO);
    {
        JsonlSink sink(SinkConfig::jsonl("-"));
        EXPECT_EQ(::write(file, "first\n", 6), 6);
        EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 3u);
        EXPECT_EQ(::write(file, "last\n", 5), 5);
    }
    dup2(output, STDOUT_FILENO);
    ::close(output);
    ::close(file);
    EXPECT_EQ(content(path), "first\n" + lines + "last\n");
}

/// Standard output is a terminal that nobody reads.
class JsonlSinkTerminalTest : public JsonlSinkTest {
protected:
    JsonlSinkTerminalTest() {
        std::fflush(stdout);
        m_output = dup(STDOUT_FILENO);
        m_master = posix_openpt(O_RDWR | O_NOCTTY);
        EXPECT_EQ(grantpt(m_master) + unlockpt(m_master), 0);
        const int slave = ::open(ptsname(m_master), O_RDWR | O_NOCTTY);
        dup2(slave, STDOUT_FILENO);
        ::close(slave);
    }
    ~JsonlSinkTerminalTest() override {
        dup2(m_output, STDOUT_FILENO);
        ::close(m_output);
        release();
    }
    /// Ends everything that waits for the terminal.
    void release() {
        if (m_master != -1) {
            ::close(std::exchange(m_master, -1));
        }
    }

private:
    int m_output = -1;
    int m_master = -1;
};

TEST_F(JsonlSinkTerminalTest, ATerminalWithLittleRoomDoesNotDelayTheStop) {
    JsonlSink sink(SinkConfig::jsonl("-"));
    auto delivering = std::async(std::launch::async, [&] {
        while (sink.deliver(from(0), giveUp.get_token()) == 3) {
        }
    });
    const auto before = delivering.wait_for(std::chrono::milliseconds(300));
    giveUp.request_stop();
    const auto after = delivering.wait_for(std::chrono::seconds(20));
    release(); // a failure of the test is written there, too
    EXPECT_EQ(before, std::future_status::timeout);
    EXPECT_EQ(after, std::future_status::ready);
}

TEST_F(JsonlSinkPipeTest, AReaderThatHasGoneIsAFailure) {
    close(reader);
    reader = -1;
    JsonlSink sink(SinkConfig::jsonl("-"));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
    EXPECT_EQ(sink.error(), "write failed: Broken pipe");
}

} // namespace
