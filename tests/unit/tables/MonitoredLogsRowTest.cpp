// The rows of Monitored Logs.

#include "MonitoredLogsFixture.h"
#include "support/Faults.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

using MonitoredLogsRow = MonitoredLogs;

TEST_F(MonitoredLogsRow, RowShowsTheLogsState) {
    const std::string path = m_directory.write("app.log", std::string(1234, 'x'));
    timespec times[2] = {{now - 3600, 0}, {now - 3600, 0}};
    utimensat(AT_FDCWD, path.c_str(), times, 0);
    TestLog& log = m_logs.add(path);
    log.setType('U');
    log.setDebugMode('Y');
    log.setLogProcedure("%4d YEAR");
    log.setStatus(MONITOR_ERR_READ, now - 60);
    log.setCounts(17, 3);
    sample(0);
    const zrm_rmmonlog_data_t shown = row(0);
    EXPECT_EQ(text(shown.originnode), padded("web1:ZRM", 64));
    EXPECT_EQ(text(shown.logpath), padded(m_directory.path().string() + "/", 256));
    EXPECT_EQ(text(shown.ulogpath), padded(m_directory.path().string() + "/", 768));
    EXPECT_EQ(text(shown.logname), padded("app.log", 128));
    EXPECT_EQ(text(shown.ulogname), padded("app.log", 384));
    EXPECT_EQ(shown.logtype[0], 'U');
    EXPECT_EQ(text(shown.monstatus), padded(monitorStatusText(MONITOR_ERR_READ), 32));
    EXPECT_EQ(text(shown.montime), "1270115075900000");
    EXPECT_EQ(shown.numevents, 17);
    EXPECT_EQ(shown.numerrors, 3);
    EXPECT_EQ(shown.logsize, 1234);
    EXPECT_EQ(text(shown.logmoddate), "1270115070000000");
    EXPECT_EQ(shown.debugmode[0], 'Y');
    EXPECT_EQ(text(shown.formatter), padded("%4d YEAR", 256));
    EXPECT_EQ(text(shown.timestamp), "1270115080000000");
    EXPECT_EQ(shown.sampleno, 0);
    EXPECT_EQ(shown.rowno, 0);
}

TEST_F(MonitoredLogsRow, LocalAndUTF8NamesAreShownSeparately) {
    TestLog& log = m_logs.add("/tmp/x");
    log.setLocalName("/\xFC/gr\xFC\xDF"
                     "e");
    log.setUTF8Name("/\xC3\xBC/gr\xC3\xBC\xC3\x9F"
                    "e");
    sample(0);
    EXPECT_EQ(text(row(0).logpath), padded("/\xFC/", 256));
    EXPECT_EQ(text(row(0).logname), padded("gr\xFC\xDF"
                                           "e",
                                           128));
    EXPECT_EQ(text(row(0).ulogpath), padded("/\xC3\xBC/", 768));
    EXPECT_EQ(text(row(0).ulogname), padded("gr\xC3\xBC\xC3\x9F"
                                            "e",
                                            384));
}

TEST_F(MonitoredLogsRow, LongTextsAreCutAtTheirColumns) {
    const std::string directory = "/" + std::string(900, 'd') + "/";
    TestLog& log = m_logs.add(directory + std::string(500, 'n'));
    log.setLogProcedure(std::string(300, 'f').c_str());
    std::memset(m_systemName, 's', 64);
    m_systemName[64] = '\0';
    sample(0);
    EXPECT_EQ(text(row(0).originnode), std::string(64, 's'));
    EXPECT_EQ(text(row(0).logpath), directory.substr(0, 256));
    EXPECT_EQ(text(row(0).ulogpath), directory.substr(0, 768));
    EXPECT_EQ(text(row(0).logname), std::string(128, 'n'));
    EXPECT_EQ(text(row(0).ulogname), std::string(384, 'n'));
    EXPECT_EQ(text(row(0).formatter), std::string(256, 'f'));
}

TEST_F(MonitoredLogsRow, ANameOfTwoHundredBytesFillsItsColumnWithoutATerminator) {
    const std::string name(200, 'n');
    m_logs.add(m_directory.write(name, ""));
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(text(row(0).logname), std::string(128, 'n'));
    EXPECT_EQ(row(0).logtype[0], 'S') << "the next column follows directly";
    EXPECT_EQ(text(row(0).ulogname), padded(name, 384));
}

TEST_F(MonitoredLogsRow, MissingNamesAndFormatsAreBlank) {
    m_logs.add("/a/b").setNoName();
    gSystemName = nullptr;
    sample(0);
    EXPECT_EQ(text(row(0).originnode), padded("", 64));
    EXPECT_EQ(text(row(0).logpath), padded("", 256));
    EXPECT_EQ(text(row(0).logname), padded("", 128));
    EXPECT_EQ(text(row(0).ulogpath), padded("", 768));
    EXPECT_EQ(text(row(0).ulogname), padded("", 384));
    EXPECT_EQ(text(row(0).formatter), padded("", 256));
}

TEST_F(MonitoredLogsRow, CountsAreCutToThirtyTwoBits) {
    m_logs.add("/a/b").setCounts(0x100000005, 0x2FFFFFFFF);
    sample(0);
    EXPECT_EQ(row(0).numevents, 5);
    EXPECT_EQ(row(0).numerrors, -1);
}

TEST_F(MonitoredLogsRow, ARemovedFileIsMarked) {
    const std::string path = m_directory.file("gone.log");
    m_logs.add(path);
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre("stat() command failed for " + path +
                                                ";  errno = 2; No such file or directory."));
    EXPECT_EQ(row(0).logsize, -1);
    EXPECT_EQ(text(row(0).logmoddate), "0000000000000000");
    EXPECT_EQ(text(row(0).timestamp), "1270115080000000") << "the rest of the row is there";
}

TEST_F(MonitoredLogsRow, AFollowedLogWithoutAFileIsMarkedButNotTraced) {
    m_logs.add(m_directory.file("gone.log")).setFollowed();
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(row(0).logsize, -1);
    const Fault fault("stat", EACCES);
    EXPECT_THAT(sample(TRC1_ERROR), SizeIs(1));
}

TEST_F(MonitoredLogsRow, AFileThatCannotBeExaminedIsMarked) {
    const std::string path = m_directory.write("a.log", "12345");
    m_logs.add(path);
    const Fault fault("stat", EACCES);
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre("stat() command failed for " + path +
                                                ";  errno = 13; Permission denied."));
    EXPECT_EQ(row(0).logsize, -1);
}

TEST_F(MonitoredLogsRow, AHugeFilesSizeIsCutToThirtyTwoBits) {
    const std::string path = m_directory.write("huge.log", "");
    ASSERT_EQ(truncate(path.c_str(), 0x100000007), 0); // sparse
    m_logs.add(path);
    sample(0);
    EXPECT_EQ(row(0).logsize, 7);
}

} // namespace
