#ifndef ZRM_TESTS_FILE_FOLLOWER_TEST_H
#define ZRM_TESTS_FILE_FOLLOWER_TEST_H

#include "monitor/FileFollower.h"

#include "FakeCompression.h"
#include "support/Faults.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <utility>

#include <sys/stat.h>
#include <unistd.h>

using namespace zrm;
namespace fs = std::filesystem;

using std::chrono::seconds;
using State = FollowLedger::State;

class FileFollowerTest : public testing::Test {
protected:
    FileFollowerTest() {
        m_options.rotateWait = seconds(2);
        begin();
    }

    void begin(const std::optional<LogPosition>& stored = std::nullopt) {
        m_follower = std::make_unique<FileFollower>(m_path, m_options, m_ledger);
        if (stored) {
            m_follower->resumeAt(*stored);
        }
    }

    /// What a look after some time delivers.
    std::string look(seconds passed = seconds(1)) {
        m_now += passed;
        std::string text;
        if (!m_follower->isQuiet() && m_follower->look({m_now, 0})) {
            while (const char* const entry = m_follower->next()) {
                text += entry;
            }
        }
        m_follower->noteProgress();
        return text;
    }

    /// What several looks deliver, the later ones after any wait for a quiet file is over.
    std::string looks(int count) {
        std::string text = look();
        for (; count > 1; --count) {
            text += look(seconds(3));
        }
        return text;
    }

    void append(std::string_view text) { m_directory.append("app.log", text); }
    std::string file(std::string_view name) const { return m_directory.file(name); }
    void rename(std::string_view from, std::string_view to) { fs::rename(file(from), file(to)); }
    void copyAndTruncate(std::string_view to) {
        fs::copy_file(m_path, file(to));
        fs::resize_file(m_path, 0);
    }

    /// Writes a file, or takes one as it is, and sets its time of modification.
    static void age(const std::string& path, int secondsAgo, std::string_view text = {}) {
        if (!text.empty()) {
            std::ofstream(path) << text;
        }
        fs::last_write_time(path, fs::file_time_type::clock::now() - seconds(secondsAgo));
    }

    /// Waits until the file system's clock has moved on, so that the next change shows.
    void waitForTick() const {
        const auto changedAt = [](const std::string& path) {
            struct stat status {};
            EXPECT_EQ(::stat(path.c_str(), &status), 0);
            return std::pair(status.st_ctim.tv_sec, status.st_ctim.tv_nsec);
        };
        const auto before = changedAt(m_path);
        do {
            m_directory.write("tick", "");
        } while (changedAt(file("tick")) <= before);
    }

    /// Begins another follower at the position.
    void restart() { begin(m_follower->position()); }

    const FakeCompression m_compression;
    TemporaryDirectory m_directory;
    std::string m_path = m_directory.write("app.log", "old\n");
    FileFollower::Options m_options;
    FollowLedger m_ledger;
    std::unique_ptr<FileFollower> m_follower;
    std::chrono::steady_clock::time_point m_now{std::chrono::hours(1)};
};

#endif
