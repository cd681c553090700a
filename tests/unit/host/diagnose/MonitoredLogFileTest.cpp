#include "host/diagnose/MonitoredLogFile.h"

#include "support/ReasonOf.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <optional>
#include <string>

#include <sys/stat.h>

using namespace zrm;
using namespace zrm::host;

namespace {

class MonitoredLogFileTest : public testing::Test {
protected:
    static FileIdentity identityOf(const std::string& path) {
        struct stat status {};
        EXPECT_EQ(stat(path.c_str(), &status), 0) << path;
        return {status.st_dev, status.st_ino};
    }
    /// Why the log cannot be read while its monitor has this file open.
    std::string problem(const std::optional<FileIdentity>& monitored) const {
        return reasonOf(MonitoredLogFile::open(m_log, monitored));
    }

    TemporaryDirectory m_directory;
    const std::string m_log = m_directory.write("app.log", "line\n");
    const std::string m_secret = m_directory.write("secret", "secret\n");
};

TEST_F(MonitoredLogFileTest, OpensTheFileThatTheMonitorHas) {
    const Result<MonitoredLogFile> file = MonitoredLogFile::open(m_log, identityOf(m_log));
    ASSERT_EQ(reasonOf(file), "");
    struct stat status {};
    ASSERT_EQ(fstat(file->descriptor(), &status), 0);
    EXPECT_EQ(status.st_size, 5);
}

TEST_F(MonitoredLogFileTest, DoesNotOpenAnotherFileOfTheSameName) {
    const FileIdentity monitored = identityOf(m_log);
    const std::string another = "the log cannot be read: another file now has its name, and its "
                                "monitor reads the one that had the name before";
    std::filesystem::rename(m_log, m_directory.file("app.log.1"));
    EXPECT_EQ(problem(monitored), "the log cannot be read: No such file or directory");
    m_directory.write("app.log", "successor\n");
    EXPECT_EQ(problem(monitored), another);
    std::filesystem::remove(m_log);
    std::filesystem::create_symlink(m_secret, m_log);
    EXPECT_EQ(problem(monitored), another);
    std::filesystem::remove(m_log);
    std::filesystem::create_symlink(m_directory.file("app.log.1"), m_log);
    EXPECT_EQ(problem(monitored), "") << "a link to the log itself";
}

TEST_F(MonitoredLogFileTest, DoesNotFollowALinkWhenNoMonitorHasTheFileOpen) {
    EXPECT_EQ(problem(std::nullopt), "");
    std::filesystem::remove(m_log);
    std::filesystem::create_symlink(m_secret, m_log);
    EXPECT_EQ(problem(std::nullopt), "the log cannot be read: its name is a symbolic link, and no "
                                     "monitor has its file open");
}

TEST_F(MonitoredLogFileTest, OpensOnlyRegularFilesWithoutWaitingForPipes) {
    std::filesystem::remove(m_log);
    ASSERT_EQ(mkfifo(m_log.c_str(), 0600), 0);
    EXPECT_EQ(problem(std::nullopt), "the log cannot be read: it is not a regular file");
    std::filesystem::remove(m_log);
    std::filesystem::create_directory(m_log);
    EXPECT_EQ(problem(std::nullopt), "the log cannot be read: it is not a regular file");
}

} // namespace
