#include "monitor/ReadGuard.h"

#include "support/Faults.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <string>

#include <fcntl.h>
#include <unistd.h>

using namespace zrm;

namespace {

class ReadGuardTest : public testing::Test {
protected:
    ~ReadGuardTest() override { close(m_fd); }
    void take(std::size_t end) { m_guard.take(m_fd, static_cast<std::int64_t>(end)); }
    bool holds() const { return m_guard.holds(m_fd); }
    std::int64_t unread() const { return m_guard.unreadInCopy(m_fd, m_path.c_str()); }

    const std::string m_text = std::string(1000, 'x') + "the last line that was read\n";
    TemporaryDirectory m_directory;
    const std::string m_path = m_directory.write("app.log", m_text);
    const int m_fd = open(m_path.c_str(), O_RDONLY | O_CLOEXEC);
    ReadGuard m_guard;
};

TEST_F(ReadGuardTest, HoldsAsLongAsTheBytesAreThere) {
    EXPECT_TRUE(holds()) << "nothing is remembered";
    take(m_text.size());
    EXPECT_TRUE(holds());
    m_directory.append("app.log", "more\n");
    EXPECT_TRUE(holds());
    m_directory.write("app.log", std::string(2 * m_text.size(), 'y'));
    EXPECT_FALSE(holds());
    m_directory.write("app.log", "short\n");
    EXPECT_FALSE(holds());
    take(6);
    EXPECT_TRUE(holds());
}

TEST_F(ReadGuardTest, RemembersNothingWhereNothingCanBeRead) {
    take(0);
    m_directory.write("app.log", "other\n");
    EXPECT_TRUE(holds());
    {
        const Fault fault("pread", EIO);
        take(6);
    }
    m_directory.write("app.log", "still another\n");
    EXPECT_TRUE(holds());
    EXPECT_EQ(unread(), -1);
}

TEST_F(ReadGuardTest, FindsTheUnreadEndInTheCopyOfARotation) {
    take(m_text.size());
    m_directory.write("app.log.1", m_text + "unread\n");
    m_directory.write("app.log.2", std::string(5000, 'y')); // other contents
    m_directory.write("other.log", m_text + "of another name\n");
    m_directory.write("app.log", "");
    EXPECT_EQ(unread(), 7);
    m_directory.write("app.log.1", m_text);
    EXPECT_EQ(unread(), 0);
}

TEST_F(ReadGuardTest, UsesTheNewestOfSeveralCopies) {
    take(m_text.size());
    const auto old = std::filesystem::path(m_directory.write("app.log.1", m_text + "unread\n"));
    m_directory.write("app.log.2", m_text + "unread and more\n");
    std::filesystem::last_write_time(old,
                                     std::filesystem::last_write_time(old) - std::chrono::hours(1));
    EXPECT_EQ(unread(), 16);
}

TEST_F(ReadGuardTest, FindsNoCopyInTheLogItselfNorBehindASymbolicLink) {
    take(m_text.size() - 5);
    EXPECT_EQ(unread(), -1);
    std::filesystem::create_hard_link(m_path, m_directory.file("app.log.hard"));
    const std::string elsewhere = m_directory.write("elsewhere", m_text);
    std::filesystem::create_symlink(elsewhere, m_directory.file("app.log.link"));
    EXPECT_EQ(unread(), -1);
    EXPECT_EQ(m_guard.unreadInCopy(m_fd, "app.log"), -1) << "not a complete path";
    EXPECT_EQ(m_guard.unreadInCopy(m_fd, "/none/app.log"), -1);
}

} // namespace
