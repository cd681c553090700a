#include "host/diagnose/LogWarnings.h"

#include "host/base/TimeText.h"
#include "support/TemporaryDirectory.h"
#include "support/TimeZone.h"

#include <cstring>
#include <ctime>
#include <filesystem>
#include <optional>
#include <string>

#include <gmock/gmock.h>
#include <sys/stat.h>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class LogWarningsTest : public testing::Test {
protected:
    static std::vector<std::string> kindsOf(const LogLedgerView& log) {
        std::vector<std::string> kinds;
        for (const LogWarning& warning : LogWarnings::of(log)) {
            kinds.push_back(warning.kind);
        }
        return kinds;
    }
    /// The ledger of a log that has opened its file.
    LogLedgerView opened() const {
        LogLedgerView log;
        log.file = m_path;
        struct stat status {};
        EXPECT_EQ(stat(m_path.c_str(), &status), 0);
        log.openFile = FileIdentity{status.st_dev, status.st_ino};
        return log;
    }
    static std::string record(std::time_t time, const char* user) {
        std::string bytes(40, '\0');
        std::memcpy(bytes.data(), user, std::strlen(user));
        const std::int64_t seconds = time;
        std::memcpy(bytes.data() + 32, &seconds, sizeof seconds);
        return bytes;
    }
    std::optional<std::string> accounting(const std::string& content) const {
        return LogWarnings::ofAccountingFile(m_directory.write("wtmp", content));
    }
    std::optional<std::string> syslog(const std::string& content) const {
        return LogWarnings::ofSyslogFile(m_directory.write("messages", content));
    }

    TemporaryDirectory m_directory;
    std::string m_path = m_directory.write("app.log", "");
};

TEST_F(LogWarningsTest, ChecksTheNameOfAnOpenFile) {
    LogLedgerView log = opened();
    EXPECT_THAT(kindsOf(log), IsEmpty());
    std::filesystem::rename(m_path, m_directory.file("app.log.1"));
    EXPECT_THAT(kindsOf(log), ElementsAre("missing"));
    m_directory.write("app.log", "");
    EXPECT_THAT(kindsOf(log), ElementsAre("replaced"));
    EXPECT_THAT(LogWarnings::of(log)[0].text, HasSubstr("copytruncate"));
    log.openFile.reset(); // its monitor has ended, which its status says
    EXPECT_THAT(kindsOf(log), IsEmpty());
}

TEST_F(LogWarningsTest, WarnsAboutWhatWasLostWithinADay) {
    constexpr std::int64_t hour = 60 * 60 * 1000;
    const TimeZone zone("EST5");
    const std::int64_t now = WallClock::now();
    const auto local = [](std::int64_t time) {
        std::string text = UtcTime::text(time - 5 * hour).substr(0, 19);
        text[10] = ' ';
        return text + " -0500";
    };
    LogLedgerView log = opened();
    log.follow.emplace().state = "reading";
    EXPECT_THAT(kindsOf(log), IsEmpty());
    log.follow->lost = {{now - 25 * hour, 0, 100, ""}};
    EXPECT_THAT(kindsOf(log), IsEmpty());
    log.follow->lost.push_back({now - 23 * hour, 200, 260, ""});
    ASSERT_THAT(kindsOf(log), ElementsAre("lost"));
    EXPECT_THAT(LogWarnings::of(log)[0].text,
                testing::StartsWith("Bytes 200 to 260 were lost at " + local(now - 23 * hour) +
                                    ": removed"));
    log.follow->lost.push_back({now, 300, 300, ""});
    log.follow->problem = "open failed and is tried again: Too many levels of symbolic links";
    EXPECT_THAT(kindsOf(log), ElementsAre("failing", "lost"));
    EXPECT_THAT(LogWarnings::of(log)[1].text,
                testing::StartsWith("What followed byte 300 was lost at " + local(now) +
                                    ", the latest of 2 losses in 24 hours: "));
    log.follow->lost.push_back({now, 0, 50, "/var/log/app.log.1"});
    EXPECT_THAT(LogWarnings::of(log)[1].text, HasSubstr(": /var/log/app.log.1 cannot be read."));
}

TEST_F(LogWarningsTest, WarnsAboutASyslogFileWithoutTimes) {
    LogLedgerView log = opened();
    log.rows = 10;
    log.withoutTime = 5;
    EXPECT_THAT(kindsOf(log), IsEmpty());
    log.withoutTime = 6;
    EXPECT_THAT(kindsOf(log), ElementsAre("without_time"));
    EXPECT_THAT(LogWarnings::of(log)[0].text, HasSubstr("(RSYSLOG_TraditionalFileFormat)"));
    log.type = 'U';
    EXPECT_THAT(kindsOf(log), IsEmpty()) << "a format may have no time";
    log.type = 'S';
    log.follow.emplace().state = "reading";
    ASSERT_THAT(kindsOf(log), ElementsAre("without_time"));
    EXPECT_THAT(LogWarnings::of(log)[0].text, HasSubstr("\"zrmctl suggest " + m_path + "\""));
}

TEST_F(LogWarningsTest, WarnsAboutAFileWithoutAccountingRecords) {
    const std::time_t now = std::time(nullptr);
    EXPECT_EQ(accounting(""), std::nullopt);
    EXPECT_EQ(accounting(record(now, "root") + record(now - 100, "")), std::nullopt);
    EXPECT_THAT(accounting(record(now, "root") + "x"),
                testing::Optional(HasSubstr("its size, 41 bytes")));
    EXPECT_THAT(accounting(record(now, "r\1ot")),
                testing::Optional(HasSubstr("cannot be such records")));
    EXPECT_THAT(accounting(record(now + 1000000, "root")),
                testing::Optional(HasSubstr("cannot be such records")));
    EXPECT_EQ(LogWarnings::ofAccountingFile(m_directory.file("none")), std::nullopt);
    EXPECT_EQ(LogWarnings::ofAccountingFile(m_directory.path()), std::nullopt);
    LogLedgerView log;
    log.type = 'A';
    log.file = m_directory.write("wtmp", "x");
    ASSERT_THAT(kindsOf(log), ElementsAre("not_records"));
    EXPECT_THAT(LogWarnings::of(log)[0].text, HasSubstr("its line from the log configuration"));
    log.follow.emplace();
    EXPECT_THAT(LogWarnings::of(log)[0].text, HasSubstr("remove it from the [[log]] table"));
    // Five records of Linux have the size of 48 of these.
    std::string linux;
    for (int i = 0; i < 5; ++i) {
        std::string one(384, '\0');
        one[0] = 7; // type
        const auto seconds = static_cast<std::int32_t>(now);
        std::memcpy(one.data() + 340, &seconds, sizeof seconds);
        std::memcpy(one.data() + 8, "pts/0", 5);
        std::memcpy(one.data() + 44, "root", 4);
        linux += one;
    }
    EXPECT_THAT(accounting(linux), testing::Optional(HasSubstr("cannot be such records")));
}

TEST_F(LogWarningsTest, WarnsAboutAFileWithoutSyslogTimes) {
    const std::string iso = "2026-11-20T07:03:09.412000+01:00 web1 cron[1]: text\n";
    EXPECT_EQ(syslog(""), std::nullopt);
    EXPECT_EQ(syslog("\n\n"), std::nullopt);
    EXPECT_EQ(syslog("Oct  5 07:03:09 web1 cron: text\n"), std::nullopt);
    EXPECT_EQ(syslog(iso + "Oct  5 07:03:09 web1 cron: text\n" + iso), std::nullopt) << "some have";
    EXPECT_THAT(syslog(iso + iso), testing::Optional(HasSubstr("RSYSLOG_TraditionalFileFormat")));
    EXPECT_EQ(LogWarnings::ofSyslogFile(m_directory.file("none")), std::nullopt);
}

} // namespace
