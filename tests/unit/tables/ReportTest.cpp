// Log Entries reports: which log they read and over which window.

#include "ReportFixture.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>
#include <string>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

// The hold on the chain of logs.

TEST_F(Report, HoldsTheChainOfLogsFromConstructionToDestruction) {
    m_request.reset(m_manager.CreateCtreq(&m_test, nullptr));
    EXPECT_THAT(m_logs.calls, ElementsAre("begin"));
    m_request.reset();
    EXPECT_THAT(m_logs.calls, ElementsAre("begin", "end"));
}

TEST_F(Report, WithoutALogManagerReturnsNothing) {
    m_logs.withdraw();
    nameAndWindow();
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre("Log Manager not found. Request terminating."));
    m_request.reset();
    EXPECT_THAT(m_logs.calls, IsEmpty());
}

TEST_F(Report, ConstructionAndDestructionAreNotTraced) {
    RecordingTrace trace(TRC1_DETAIL | TRC1_ERROR);
    m_request.reset(m_manager.CreateCtreq(&m_test, nullptr));
    m_request.reset();
    EXPECT_THAT(trace.messages(), IsEmpty());
    EXPECT_THAT(m_test.stopped, IsEmpty());
}

// The log.

TEST_F(Report, PathAndNameAreJoined) {
    nameAndWindow();
    sample(0);
    EXPECT_THAT(m_logs.calls, ElementsAre("begin", "find /var/adm/messages"));
    EXPECT_EQ(m_log.starts, 1);
}

TEST_F(Report, DecisionsAreTracedInTheDetailClass) {
    nameAndWindow();
    EXPECT_THAT(
        sample(TRC1_DETAIL),
        ElementsAre("Log path = /var/adm/.", "Log name = messages.",
                    "Filter column name  = LOGPATH.", "Filter column name  = LOGNAME.",
                    "Filter column name  = ENTRYTIME.", "Report start time = 1261120070000000.",
                    "Filter column name  = ENTRYTIME.", "Report end time = 1261120080000000.",
                    "Request start time = 1261120070000000; request end time = "
                    "1261120080000000."));
}

TEST_F(Report, APathWithoutItsSeparatorMatchesNoLog) {
    name("/var/adm", "messages");
    window();
    EXPECT_THAT(sample(TRC1_ERROR),
                ElementsAre("Log file /var/admmessages is not being monitored.", noName));
    EXPECT_EQ(m_request->count, 0U);
}

TEST_F(Report, WithoutAPathOrANameThereIsNoLog) {
    window();
    EXPECT_THAT(sample(TRC1_DETAIL), ElementsAre("Log path is null.", "Log name is null."));
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre(noName));
    m_test.text("LOGPATH", equal, "/var/adm/").text("LOGNAME", equal, "   ");
    EXPECT_THAT(sample(TRC1_DETAIL), ElementsAre("Log path = /var/adm/.", "Log name is null."));
    m_test.filters.clear();
    m_test.text("LOGNAME", equal, "messages").raw("LOGPATH", equal, 452, "/var/adm/", -1);
    EXPECT_THAT(sample(TRC1_DETAIL), ElementsAre("Log path is null.", "Log name = messages."));
    EXPECT_THAT(m_logs.calls, ElementsAre("begin"));
}

TEST_F(Report, PaddingOfNamesIsIgnored) {
    name("/var/adm/   ", "messages        ");
    window();
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(m_log.starts, 1);
}

TEST_F(Report, UTF8NamesAreConvertedToTheLocalCodePage) {
    TestLog& umlaut = m_logs.add("/var/\xFC/gr\xFC\xDF"
                                 "e");
    m_test
        .text("ULOGNAME", equal,
              "gr\xC3\xBC\xC3\x9F"
              "e")
        .text("ULOGPATH", equal, "/var/\xC3\xBC/");
    window();
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(umlaut.starts, 1);
}

TEST_F(Report, TheFirstSpellingOfEachPartWins) {
    m_test.text("ULOGPATH", equal, "/var/adm/")
        .text("LOGPATH", equal, "/other/")
        .text("LOGNAME", equal, "messages")
        .text("ULOGNAME", equal, "other");
    window();
    sample(0);
    EXPECT_EQ(m_log.starts, 1);
    EXPECT_EQ(m_logs.calls.back(), "find /var/adm/messages");
}

TEST_F(Report, ConditionsAreReadUntilTheLogIsNamed) {
    name("/var/adm/", "other");
    m_test.text("ENTRYSRC", equal, "sshd").text("ENTRYTYPE", equal, "never reached");
    sample(0);
    EXPECT_EQ(m_test.fetched, 2);
}

TEST_F(Report, NamesAreCutAtTheirColumns) {
    const std::string path = "/" + std::string(300, 'p');
    const std::string file(200, 'n');
    name(path, file);
    window();
    sample(0);
    EXPECT_EQ(m_logs.calls.back(), "find " + path.substr(0, 256) + file.substr(0, 128));
}

TEST_F(Report, TheLongestConvertedNamesAreJoinedWhole) {
    const std::string path = "/" + std::string(3000, 'p');
    const std::string file(3000, 'n');
    m_test.text("ULOGPATH", equal, path).text("ULOGNAME", equal, file);
    window();
    EXPECT_EQ(sample(TRC1_ERROR).size(), 2U);
    EXPECT_EQ(m_logs.calls.back(), "find " + path.substr(0, 1152) + file.substr(0, 384));
}

// The window.

TEST_F(Report, NeedsBothTimes) {
    name("/var/adm/", "messages");
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre(noWindow));
    m_test.text("ENTRYTIME", greaterOrEqual, startStamp);
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre(noWindow));
    EXPECT_EQ(m_request->count, 0U);
    EXPECT_EQ(m_log.starts, 0);
    // The batch left from the previous sample is replaced.
    m_log.entries = 3;
    m_test.text("ENTRYTIME", lessOrEqual, endStamp);
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(rows(), upTo(3));
}

TEST_F(Report, NeedsAnEndWithAStart) {
    name("/var/adm/", "messages");
    m_test.text("ENTRYTIME", lessOrEqual, endStamp);
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre(noWindow));
}

TEST_F(Report, ABlankTimeCountsAsMissing) {
    name("/var/adm/", "messages");
    m_test.text("ENTRYTIME", lessOrEqual, endStamp)
        .text("ENTRYTIME", greaterOrEqual, std::string(16, ' '));
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre(noWindow));
}

TEST_F(Report, TimesOfAnImpossibleLengthAreIgnored) {
    name("/var/adm/", "messages");
    m_test.text("ENTRYTIME", greaterOrEqual, startStamp + "0")
        .raw("ENTRYTIME", lessOrEqual, 452, endStamp, -1);
    EXPECT_THAT(sample(TRC1_ERROR),
                ElementsAre("Invalid ENTRYTIME threshold; value length is 17. Threshold ignored.",
                            "Invalid ENTRYTIME threshold; value length is -1. Threshold ignored.",
                            noWindow));
}

TEST_F(Report, TimesWithAnotherOperatorAreIgnored) {
    name("/var/adm/", "messages");
    m_test.text("ENTRYTIME", 6, startStamp).text("ENTRYTIME", 5, endStamp);
    window();
    EXPECT_THAT(sample(TRC1_ERROR),
                ElementsAre("Invalid ENTRYTIME compare operator; value is 6. Threshold ignored.",
                            "Invalid ENTRYTIME compare operator; value is 5. Threshold ignored."));
    EXPECT_EQ(m_log.starts, 1);
}

TEST_F(Report, ALaterTimeReplacesAnEarlierOneUntilBothAreKnown) {
    name("/var/adm/", "messages");
    m_test.text("ENTRYTIME", lessOrEqual, "1111111111111111")
        .text("ENTRYTIME", lessOrEqual, endStamp)
        .text("ENTRYTIME", greaterOrEqual, startStamp)
        .text("ENTRYTIME", greaterOrEqual, "0000000000000000");
    sample(0);
    EXPECT_STREQ(m_log.seen.startTime, startStamp.c_str());
    EXPECT_STREQ(m_log.seen.endTime, endStamp.c_str());
}

TEST_F(Report, TimesAreReadUntilBothAreKnown) {
    name("/var/adm/", "messages");
    window();
    m_test.text("ENTRYTIME", lessOrEqual, "9999999999999999").text("ENTRYTIME", equal, startStamp);
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_STREQ(m_log.seen.endTime, endStamp.c_str());
}

TEST_F(Report, ATimeIsTakenAsSixteenBytesWhateverItsLength) {
    name("/var/adm/", "messages");
    m_test.raw("ENTRYTIME", greaterOrEqual, 452, startStamp, 0)
        .raw("ENTRYTIME", lessOrEqual, 452, endStamp, 13);
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_STREQ(m_log.seen.startTime, startStamp.c_str());
    EXPECT_STREQ(m_log.seen.endTime, endStamp.c_str());
}

TEST_F(Report, HasNoEventRateThresholds) {
    m_test.number("FREQTHRESH", greaterOrEqual, 5).number("PERIODTHRS", equal, 60);
    nameAndWindow();
    m_log.entries = 2;
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(m_log.seen.freqThreshold, 0);
    EXPECT_EQ(m_log.seen.periodThreshold, 0);
    EXPECT_EQ(rows(), upTo(2));
}

} // namespace
