#include "monitor/FileFollower.h"

#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <array>
#include <filesystem>
#include <map>
#include <memory>
#include <random>
#include <string>
#include <vector>

using namespace zrm;
namespace fs = std::filesystem;

using std::chrono::seconds;

namespace {

/// Some logs of one directory, whose files get each other's names.
class FileOwnersTest : public testing::Test {
protected:
    struct Log {
        FollowLedger ledger;
        std::unique_ptr<FileFollower> follower;
        std::optional<LogPosition> stored;
    };

    /// Follows a log from the beginning of its file, or from where it was when it was ended.
    void follow(const std::string& name) {
        Log& log = m_logs[name];
        FileFollower::Options options;
        options.fromBeginning = true;
        options.owners = m_owners.get();
        options.log = name;
        log.follower = std::make_unique<FileFollower>(file(name), options, log.ledger);
        if (log.stored) {
            log.follower->resumeAt(*log.stored);
        }
    }

    void end(const std::string& name) {
        m_logs[name].stored = m_logs[name].follower->position();
        m_logs[name].follower.reset();
    }

    /// As if the process had ended after all logs were, and another one began.
    void beginProcess() {
        m_owners = std::make_unique<FileOwners>();
        std::vector<FileOwners::Expected> expected;
        for (const auto& [name, log] : m_logs) {
            if (log.stored) {
                expected.emplace_back(name, *log.stored);
                for (const LogPosition& late : log.stored->late.files()) {
                    expected.emplace_back(name, late);
                }
            }
        }
        m_owners->expect(expected);
    }

    /// What a look at a log delivers some time after the last.
    std::string look(const std::string& name, seconds passed = seconds(1)) {
        m_now += passed;
        std::string text;
        FileFollower& follower = *m_logs[name].follower;
        if (!follower.isQuiet() && follower.look({m_now, 0})) {
            while (const char* const entry = follower.next()) {
                text += entry;
            }
        }
        follower.takeLeft();
        follower.noteProgress();
        return text;
    }

    /// What looks deliver, one after another.
    std::string looks(const std::vector<std::string>& names, seconds passed = seconds(3)) {
        std::string text;
        for (const std::string& name : names) {
            text += look(name, passed);
        }
        return text;
    }

    std::string file(const std::string& name) const { return m_directory.file(name); }
    void write(const std::string& name, const std::string& text) { m_directory.append(name, text); }
    void rename(const std::string& from, const std::string& to) {
        fs::rename(file(from), file(to));
    }
    FollowLedger::State stateOf(const std::string& name) { return m_logs[name].ledger.state(); }

    TemporaryDirectory m_directory;
    std::unique_ptr<FileOwners> m_owners = std::make_unique<FileOwners>();
    std::map<std::string, Log> m_logs;
    std::chrono::steady_clock::time_point m_now{std::chrono::hours(1)};
};

/// Two logs that were read.
class RenamedOverTest : public FileOwnersTest {
protected:
    RenamedOverTest() {
        write("a.log", "a1\n");
        write("b.log", "b1\n");
        follow("a.log");
        follow("b.log");
        EXPECT_EQ(look("a.log"), "a1\n");
        EXPECT_EQ(look("b.log"), "b1\n");
    }
};

TEST_F(RenamedOverTest, TheFileIsReadOnUnderItsNewName) {
    write("a.log", "a2\n");
    rename("a.log", "b.log");
    EXPECT_EQ(look("b.log"), "");
    EXPECT_EQ(stateOf("b.log"), FollowLedger::State::taken);
    write("b.log", "a3\nunfinished");
    EXPECT_EQ(look("a.log"), "") << "given up as soon as it is asked for";
    EXPECT_EQ(looks({"b.log", "b.log"}), "a2\na3\n");
    write("b.log", " line\n");
    write("a.log", "new\n");
    EXPECT_EQ(look("b.log"), "unfinished line\n");
    EXPECT_EQ(look("a.log"), "new\n");
    EXPECT_EQ(m_logs["a.log"].ledger.losses() + m_logs["b.log"].ledger.losses(), 0);
}

TEST_F(RenamedOverTest, TheFileIsNotGivenUpWhileItsLogHasItsName) {
    fs::remove(file("b.log"));
    fs::create_hard_link(file("a.log"), file("b.log"));
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(look("b.log", seconds(3)), "");
        write("a.log", "a2\n");
        EXPECT_EQ(look("a.log", seconds(3)), "a2\n");
    }
    fs::remove(file("a.log"));
    EXPECT_EQ(looks({"b.log", "a.log"}), "");
    write("b.log", "a3\n");
    EXPECT_EQ(looks({"b.log", "b.log"}), "a3\n");
}

TEST_F(RenamedOverTest, LogsThatExchangeTheirNamesExchangeTheirFiles) {
    rename("a.log", "c");
    rename("b.log", "a.log");
    rename("c", "b.log");
    write("a.log", "b2\n");
    write("b.log", "a2\n");
    EXPECT_EQ(look("a.log"), "a2\n") << "nobody has asked for its file yet";
    EXPECT_EQ(look("b.log"), "") << "it was asked for";
    EXPECT_EQ(looks({"a.log", "a.log"}), "b2\n");
    EXPECT_EQ(looks({"b.log", "b.log"}), "");
    write("a.log", "b3\n");
    write("b.log", "a3\n");
    EXPECT_EQ(looks({"a.log", "a.log"}), "b3\n");
    EXPECT_EQ(looks({"b.log", "b.log"}), "a3\n");
}

TEST_F(RenamedOverTest, AFileThatIsOnlyWatchedForLateLinesIsGivenUp) {
    rename("a.log", "a.log.1");
    write("a.log", "a2\n");
    EXPECT_EQ(looks({"a.log", "a.log"}), "a2\n");
    rename("a.log.1", "b.log");
    EXPECT_EQ(looks({"b.log", "a.log"}), "");
    write("b.log", "late\n");
    EXPECT_EQ(look("a.log"), "");
    EXPECT_EQ(looks({"b.log", "b.log"}), "late\n");
}

TEST_F(RenamedOverTest, ALogThatEndsLeavesItsFileToTheOther) {
    rename("a.log", "b.log");
    write("b.log", "a2\n");
    EXPECT_EQ(look("a.log"), "a2\n");
    EXPECT_EQ(look("b.log"), "");
    end("a.log");
    EXPECT_EQ(looks({"b.log", "b.log"}), "");
    write("b.log", "a3\n");
    EXPECT_EQ(look("b.log"), "a3\n");
}

TEST_F(RenamedOverTest, AtAStartTheFileIsFirstItsFormerOwners) {
    rename("a.log", "b.log");
    write("b.log", "a2\n");
    end("a.log");
    end("b.log");
    beginProcess();
    follow("b.log");
    EXPECT_EQ(look("b.log"), "");
    follow("a.log");
    EXPECT_EQ(look("a.log"), "a2\n");
    write("b.log", "a3\n");
    EXPECT_EQ(looks({"b.log", "a.log"}), "");
    EXPECT_EQ(look("b.log"), "a3\n");
    end("a.log");
    end("b.log");
    beginProcess();
    write("b.log", "a4\n");
    follow("a.log");
    EXPECT_EQ(look("a.log"), "");
    follow("b.log");
    EXPECT_EQ(look("b.log"), "a4\n");
}

TEST_F(RenamedOverTest, OfTwoPositionsInAFileTheLaterOneCounts) {
    const auto before = m_logs["a.log"].follower->position();
    rename("a.log", "b.log");
    EXPECT_EQ(looks({"b.log", "a.log"}), "");
    write("b.log", "a2\n");
    EXPECT_EQ(looks({"b.log", "b.log"}), "a2\n");
    end("a.log");
    end("b.log");
    m_logs["a.log"].stored = before; // a crash came between the two
    beginProcess();
    follow("a.log");
    follow("b.log");
    write("a.log", "new\n");
    write("b.log", "a3\n");
    EXPECT_EQ(look("a.log"), "new\n");
    EXPECT_EQ(look("b.log"), "a3\n");
    EXPECT_EQ(m_logs["a.log"].ledger.losses(), 0);
}

TEST_F(FileOwnersTest, AGenerationThatIsALogOfItsOwnIsReadAsThat) {
    write("app.log", "one\n");
    write("app-20261121.log", "");
    follow("app.log");
    follow("app-20261121.log");
    EXPECT_EQ(looks({"app.log", "app-20261121.log"}), "one\n");
    write("app-20261121.log", "two\n");
    rename("app.log", "app-20261120.log");
    write("app.log", "three\n");
    EXPECT_EQ(looks({"app.log", "app.log"}), "three\n");
    EXPECT_EQ(look("app-20261121.log"), "two\n");
}

TEST_F(FileOwnersTest, AFileIsNotKeptForALogThatIsExpectedNoMore) {
    write("b.log", "one\ntwo\n");
    follow("b.log");
    const LogPosition one = [this] {
        fs::resize_file(file("b.log"), 4);
        EXPECT_EQ(look("b.log"), "one\n");
        return *m_logs["b.log"].follower->position();
    }();
    m_logs.clear();
    write("b.log", "two\n");
    m_owners->expect({{"a.log", one}});
    follow("b.log");
    EXPECT_EQ(look("b.log"), "");
    m_owners->expect({});
    EXPECT_EQ(look("b.log"), "two\n");
}

/// Random logs, renamed over each other, exchanged, removed and made anew.
TEST_F(FileOwnersTest, EveryLineIsReadOnce) {
    const std::array<std::string, 3> names = {"a.log", "b.log", "c.log"};
    for (unsigned seed = 1; seed <= 60 && !HasFailure(); ++seed) {
        SCOPED_TRACE("seed " + std::to_string(seed));
        std::mt19937 random(seed);
        const auto name = [&]() -> const std::string& { return names[random() % names.size()]; };
        m_logs.clear();
        beginProcess();
        std::map<std::string, int> given;
        int written = 0;
        const auto lookAt = [&](const std::string& log) {
            const std::string text = look(log, seconds(random() % 3));
            for (std::size_t begin = 0; begin < text.size();) {
                const std::size_t end = text.find('\n', begin);
                ++given[text.substr(begin, end - begin)];
                begin = end + 1;
            }
        };
        const auto lookAtAll = [&](int times) {
            for (; times > 0; --times) {
                for (const std::string& log : names) {
                    lookAt(log);
                }
            }
        };
        for (const std::string& log : names) {
            fs::remove(file(log));
            follow(log);
        }
        for (int action = 0; action < 200; ++action) {
            const auto die = random() % 20;
            if (die < 9) {
                write(name(), "line " + std::to_string(written++) + "\n");
            } else if (die < 17) {
                lookAt(name());
            } else if (die < 19) {
                const std::string& from = name();
                const std::string& to = name();
                lookAtAll(3); // what nobody has opened is lost if another file gets its name
                if (from != to && fs::exists(file(from))) {
                    rename(from, to);
                }
            } else {
                lookAtAll(1);
                for (const std::string& log : names) {
                    end(log);
                }
                beginProcess();
                for (const std::string& log : names) {
                    follow(log);
                }
            }
        }
        lookAtAll(20);
        for (int line = 0; line < written; ++line) {
            EXPECT_EQ(given["line " + std::to_string(line)], 1) << "line " << line;
        }
        m_logs.clear();
    }
}

} // namespace
