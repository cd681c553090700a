#include "logs/LogBase.h"

#include "framework/trace.h"
#include "support/Faults.h"
#include "support/LocaleDouble.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdio>
#include <string>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::ExitedWithCode;

/// A log whose protected fields a test may set.
class NamedLog : public LogBase {
public:
    NamedLog() = default;
    explicit NamedLog(const char* name, int isUTF8 = 1) { setLogFileName(name, isUTF8); }
    void setKind(char type, char debugMode) {
        LogType = type;
        LogDebugMode = debugMode;
    }
};

class LogBaseTest : public testing::Test {
protected:
    LogBaseTest() { LocaleDouble::reset(); }
};

std::string dump(const LogBase& log, const std::string& fields) {
    char links[128];
    std::snprintf(links, sizeof links, "\n\tthis\t\t\t= %p\n\tNext\t\t\t= %p\n\tPrev\t\t\t= %p\n",
                  static_cast<const void*>(&log), static_cast<void*>(log.next()),
                  static_cast<void*>(log.prev()));
    return links + fields;
}

TEST_F(LogBaseTest, StartsWithDefaultsAndNoNames) {
    const LogBase log;
    EXPECT_EQ(log.debugMode(), 'N');
    EXPECT_EQ(log.type(), 'S');
    EXPECT_STREQ(log.fileNameLocal(), "");
    EXPECT_STREQ(log.fileNameUTF8(), "");
    EXPECT_STREQ(log.procedure(), "");
    EXPECT_EQ(log.pathLengthLocal(), 0U);
    EXPECT_EQ(log.pathLengthUTF8(), 0U);
    EXPECT_EQ(log.next(), nullptr);
    EXPECT_EQ(log.prev(), nullptr);
}

TEST_F(LogBaseTest, PathLengthIncludesTheLastSlash) {
    RecordingTrace trace(TRC1_ERROR);
    std::size_t pathLength = 99;
    EXPECT_STREQ(newLogFileName(pathLength, "/var/adm/messages").get(), "/var/adm/messages");
    EXPECT_EQ(pathLength, 9U);
    EXPECT_STREQ(newLogFileName(pathLength, "/messages").get(), "/messages");
    EXPECT_EQ(pathLength, 1U);
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(LogBaseTest, NameWithoutSlashHasNoPathAndIsTraced) {
    RecordingTrace trace(TRC1_ERROR);
    std::size_t pathLength = 99;
    EXPECT_STREQ(newLogFileName(pathLength, "messages").get(), "messages");
    EXPECT_EQ(pathLength, 0U);
    EXPECT_THAT(trace.messages(), ElementsAre("No / character found in file name messages."));
}

TEST_F(LogBaseTest, UTF8NameIsConvertedToTheLocalCodePage) {
    const NamedLog log("/gr\xC3\xBC\xC3\x9F/l\xC3\xB6g", 1);
    EXPECT_STREQ(log.fileNameUTF8(), "/gr\xC3\xBC\xC3\x9F/l\xC3\xB6g");
    EXPECT_EQ(log.pathLengthUTF8(), 8U);
    EXPECT_STREQ(log.fileNameLocal(), "/gr\xFC\xDF/l\xF6g");
    EXPECT_EQ(log.pathLengthLocal(), 6U);
    ASSERT_EQ(LocaleDouble::translations().size(), 1U);
    EXPECT_EQ(LocaleDouble::translations()[0].targetSize, 13U);
}

TEST_F(LogBaseTest, LocalNameIsConvertedToUTF8) {
    const NamedLog log("/gr\xFC\xDF/l\xF6g", 2);
    EXPECT_STREQ(log.fileNameLocal(), "/gr\xFC\xDF/l\xF6g");
    EXPECT_EQ(log.pathLengthLocal(), 6U);
    EXPECT_STREQ(log.fileNameUTF8(), "/gr\xC3\xBC\xC3\x9F/l\xC3\xB6g");
    EXPECT_EQ(log.pathLengthUTF8(), 8U);
    ASSERT_EQ(LocaleDouble::translations().size(), 1U);
    EXPECT_EQ(LocaleDouble::translations()[0].targetSize, 28U);
    EXPECT_EQ(LocaleDouble::translations()[0].flags, 0);
}

TEST_F(LogBaseTest, NameThatCannotBeConvertedIsEmpty) {
    LocaleDouble::setCodePage(0);
    RecordingTrace trace(TRC1_ERROR);
    const NamedLog log("/var/adm/messages", 1);
    EXPECT_STREQ(log.fileNameUTF8(), "/var/adm/messages");
    EXPECT_STREQ(log.fileNameLocal(), "");
    EXPECT_EQ(log.pathLengthLocal(), 0U);
    EXPECT_THAT(trace.messages(), ElementsAre("Codepage return was 0; Not a valid codepage.",
                                              "No / character found in file name ."));
}

TEST_F(LogBaseTest, CopyTakesNamesKindAndProcedureButNoLinks) {
    NamedLog original("/gr\xC3\xBC\xC3\x9F/log");
    original.setKind('U', 'Y');
    original.setLogProcedure("%s");
    original.addToChain(nullptr);
    const NamedLog copy(original);
    EXPECT_STREQ(copy.fileNameUTF8(), original.fileNameUTF8());
    EXPECT_STREQ(copy.fileNameLocal(), original.fileNameLocal());
    EXPECT_NE(copy.fileNameUTF8(), original.fileNameUTF8());
    EXPECT_EQ(copy.pathLengthUTF8(), 8U);
    EXPECT_EQ(copy.pathLengthLocal(), 6U);
    EXPECT_EQ(copy.type(), 'U');
    EXPECT_EQ(copy.debugMode(), 'Y');
    EXPECT_STREQ(copy.procedure(), "%s");
    EXPECT_EQ(copy.next(), nullptr);
    EXPECT_EQ(copy.prev(), nullptr);
}

TEST_F(LogBaseTest, CopyOfANamelessLogIsNameless) {
    const LogBase original;
    const LogBase copy(original);
    EXPECT_STREQ(copy.fileNameUTF8(), "");
    EXPECT_STREQ(copy.procedure(), "");
}

TEST_F(LogBaseTest, NullProcedureStaysNull) {
    LogBase log;
    log.setLogProcedure("text");
    log.setLogProcedure(nullptr);
    EXPECT_STREQ(log.procedure(), "");
}

TEST_F(LogBaseTest, ChainGrowsAtItsTailAndClosesOverARemovedMember) {
    LogBase p;
    LogBase q;
    LogBase r;
    p.addToChain(nullptr);
    EXPECT_EQ(p.next(), &p);
    EXPECT_EQ(p.prev(), &p);
    q.addToChain(&p);
    r.addToChain(&p);
    EXPECT_EQ(p.next(), &q);
    EXPECT_EQ(q.next(), &r);
    EXPECT_EQ(r.next(), &p);
    EXPECT_EQ(p.prev(), &r);
    EXPECT_EQ(r.prev(), &q);
    EXPECT_EQ(q.prev(), &p);
    q.removeFromChain();
    EXPECT_EQ(p.next(), &r);
    EXPECT_EQ(r.next(), &p);
    EXPECT_EQ(p.prev(), &r);
    EXPECT_EQ(r.prev(), &p);
    EXPECT_EQ(q.next(), &r);
    EXPECT_EQ(q.prev(), &p);
}

TEST_F(LogBaseTest, PrintSelfWritesAllFieldsWhateverTheLevel) {
    NamedLog log("/var/adm/messages");
    log.setKind('U', 'Y');
    log.setLogProcedure("%s");
    log.addToChain(nullptr);
    RecordingTrace trace(0);
    log.printSelf();
    EXPECT_THAT(trace.messages(),
                ElementsAre(dump(log, "\tLogFileNameUTF8\t\t= \"/var/adm/messages\"\n"
                                      "\tLogPathNameLengthUTF8\t= 9\n"
                                      "\tLogFileNameLocal\t= \"/var/adm/messages\"\n"
                                      "\tLogPathNameLengthLocal\t= 9\n"
                                      "\tLogDebugMode\t\t= Y\n\tLogType\t\t\t= U\n"
                                      "\tLogProcedure\t\t= \"%s\"\n")));
}

TEST_F(LogBaseTest, PrintSelfShowsAMissingProcedureAsEmpty) {
    const LogBase log;
    RecordingTrace trace(0);
    log.printSelf();
    EXPECT_THAT(trace.messages(), ElementsAre(dump(log, "\tLogFileNameUTF8\t\t= \"\"\n"
                                                        "\tLogPathNameLengthUTF8\t= 0\n"
                                                        "\tLogFileNameLocal\t= \"\"\n"
                                                        "\tLogPathNameLengthLocal\t= 0\n"
                                                        "\tLogDebugMode\t\t= N\n"
                                                        "\tLogType\t\t\t= S\n"
                                                        "\tLogProcedure\t\t= \"\"\n")));
}

using LogBaseDeathTest = LogBaseTest;

constexpr const char* outOfMemory = "^Memory allocation failed\\.  Agent is terminating\\.\n$";

TEST_F(LogBaseDeathTest, RunningOutOfMemoryEndsTheProcess) {
    RecordingTrace trace(TRC1_ERROR);
    // A UTF-8 name, the work buffer, the local name, then the procedure.
    for (const int skip : {0, 1, 2, 3}) {
        EXPECT_EXIT(
            {
                Fault fault("new", ENOMEM, {.skip = skip});
                NamedLog log("/var/adm/messages", 1);
                log.setLogProcedure("text");
                std::exit(0);
            },
            ExitedWithCode(255), outOfMemory);
    }
    for (const int skip : {0, 1, 2}) {
        EXPECT_EXIT(
            {
                Fault fault("new", ENOMEM, {.skip = skip});
                const NamedLog log("/var/adm/messages", 2);
                std::exit(0);
            },
            ExitedWithCode(255), outOfMemory);
    }
}

TEST_F(LogBaseDeathTest, RunningOutOfMemoryEndsTheProcessSilentlyWithTheErrorClassOff) {
    RecordingTrace trace(0);
    EXPECT_EXIT(
        {
            Fault fault("new", ENOMEM, {.skip = 1});
            const NamedLog log("/var/adm/messages", 1);
            std::exit(0);
        },
        ExitedWithCode(255), "^$");
}

} // namespace
