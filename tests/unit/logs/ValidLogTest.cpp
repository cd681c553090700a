#include "logs/ValidLog.h"

#include "framework/trace.h"
#include "support/Faults.h"
#include "support/LocaleDouble.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <memory>
#include <string>

#include <utime.h>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::HasSubstr;

class ValidLogTest : public testing::Test {
protected:
    ValidLogTest() { LocaleDouble::reset(); }

    static std::unique_ptr<ValidLog> parse(WhenceConfig whence, std::string line,
                                           ValidLog* head = nullptr) {
        return std::make_unique<ValidLog>(whence, line.data(), head);
    }
    static std::unique_ptr<ValidLog> user(const std::string& line, ValidLog* head = nullptr) {
        return parse(CONFIG_USER, line, head);
    }
    static std::unique_ptr<ValidLog> syslog(const std::string& line, ValidLog* head = nullptr) {
        return parse(CONFIG_DEFAULT, line, head);
    }

    TemporaryDirectory directory;
    const std::string log = directory.write("app.log", "");
    RecordingTrace trace{TRC1_ERROR};
};

TEST_F(ValidLogTest, ANameAloneIsASyslogWithoutDebugMode) {
    const auto line = user(log);
    EXPECT_TRUE(line->isValid());
    EXPECT_EQ(line->type(), 'S');
    EXPECT_EQ(line->debugMode(), 'N');
    EXPECT_EQ(line->fileNameLocal(), log);
    EXPECT_EQ(line->fileNameUTF8(), log);
    EXPECT_STREQ(line->procedure(), "");
    EXPECT_EQ(line->next(), line.get());
    EXPECT_EQ(line->prev(), line.get());
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(ValidLogTest, FieldsAreSeparatedByAnyTabsAndBlanks) {
    const auto line = user(log + " \t ;y\t\t;a   ");
    EXPECT_TRUE(line->isValid());
    EXPECT_EQ(line->debugMode(), 'Y');
    EXPECT_EQ(line->type(), 'A');
}

TEST_F(ValidLogTest, FieldsWithoutBlanksBetweenThemAreOneName) {
    const auto line = user(log + ";N;S");
    EXPECT_FALSE(line->isValid());
    EXPECT_THAT(trace.messages(), ElementsAre("stat() command failed for " + log +
                                                  ";N;S errno = 2; No such file or directory.",
                                              "Ignoring remainder of line."));
}

TEST_F(ValidLogTest, OnlyTheFirstLetterOfDebugModeCounts) {
    EXPECT_EQ(user(log + " ;Y")->debugMode(), 'Y');
    EXPECT_EQ(user(log + " ;yes")->debugMode(), 'Y');
    EXPECT_EQ(user(log + " ;no")->debugMode(), 'N');
    EXPECT_EQ(user(log + " ;x")->debugMode(), 'N');
    EXPECT_EQ(user(log + " ;;Y")->debugMode(), 'N');
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(ValidLogTest, AFieldOfOnlyTheSeparatorKeepsItsDefault) {
    const auto line = user(log + " ; ;U ;");
    EXPECT_TRUE(line->isValid());
    EXPECT_EQ(line->debugMode(), 'N');
    EXPECT_EQ(line->type(), 'U');
    EXPECT_STREQ(line->procedure(), "");
    EXPECT_EQ(user(log + " ;Y ;")->type(), 'S');
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(ValidLogTest, OnlyTheFirstLetterOfTheTypeCounts) {
    EXPECT_EQ(user(log + " ; ;Syslog")->type(), 'S');
    EXPECT_EQ(user(log + " ; ;admin")->type(), 'A');
    EXPECT_EQ(user(log + " ; ;user")->type(), 'U');
}

TEST_F(ValidLogTest, AnUnknownTypeIsRefused) {
    const auto line = user(log + " ;Y ;Queue ;x");
    EXPECT_FALSE(line->isValid());
    EXPECT_EQ(line->type(), 'S');
    EXPECT_THAT(trace.messages(), ElementsAre("Log type of Queue for log " + log +
                                              " is invalid. Ignoring remainder of line."));
}

TEST_F(ValidLogTest, AnErrorLogNeedsAix) {
    EXPECT_FALSE(user(log + " ;Y ;e")->isValid());
    {
        FakeUname uname("AIX6");
        EXPECT_FALSE(user(log + " ;Y ;E")->isValid());
    }
    EXPECT_THAT(trace.messages(), ElementsAre("Errlogs are valid only on AIX.  Ignoring line.",
                                              "Errlogs are valid only on AIX.  Ignoring line."));
}

TEST_F(ValidLogTest, AnErrorLogIsAcceptedOnAix) {
    FakeUname uname("AIX");
    trace.setLevel(TRC1_DETAIL);
    const auto line = user(log + " ;N ;e ;errpt -c -smmddhhmmyy");
    EXPECT_TRUE(line->isValid());
    EXPECT_EQ(line->type(), 'E');
    EXPECT_STREQ(line->procedure(), "errpt -c -smmddhhmmyy");
    EXPECT_THAT(trace.messages(), testing::Contains("sysname: AIX"));
    EXPECT_TRUE(user(log + " ;N ;E")->isValid());
    EXPECT_STREQ(user(log + " ;N ;E")->procedure(), "");
}

TEST_F(ValidLogTest, AnErrorLogIsAcceptedIfTheSystemIsUnknown) {
    Fault fault("uname", EFAULT);
    const auto line = user(log + " ;N ;E");
    EXPECT_TRUE(line->isValid());
    EXPECT_EQ(line->type(), 'E');
    EXPECT_THAT(trace.messages(),
                ElementsAre("uname call failed. Ignoring test for errlogs only on AIX."));
}

TEST_F(ValidLogTest, TheSystemNameIsTracedOnlyInTheDetailClass) {
    FakeUname uname("AIX");
    EXPECT_TRUE(user(log + " ;N ;E")->isValid());
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(ValidLogTest, TheNameIsSubstitutedInTheProcedure) {
    const auto line = user(log + " ;n ;u ;%s ${@}");
    EXPECT_TRUE(line->isValid());
    EXPECT_EQ(line->debugMode(), 'N');
    EXPECT_EQ(line->type(), 'U');
    EXPECT_EQ(line->procedure(), "%s " + log);
    EXPECT_EQ(user(log + " ; ;U ;${@}")->procedure(), log);
    EXPECT_EQ(user(log + " ; ;U ;a${@}${@} b ${@")->procedure(), "a" + log + log + " b ${@");
}

TEST_F(ValidLogTest, TheNameIsSubstitutedInTheLocalCodePage) {
    const std::string name = directory.write("l\xC3\xB6g", "");
    const std::string local = directory.file("l\xF6g");
    const auto line = user(name + " ; ;U ;${@}");
    EXPECT_EQ(line->fileNameLocal(), local);
    EXPECT_EQ(line->procedure(), local);
}

TEST_F(ValidLogTest, ANamelessLogSubstitutesNothingForTheName) {
    const auto line = user("relative");
    line->setLogProcedure("a${@}b");
    EXPECT_STREQ(line->procedure(), "ab");
    line->setLogProcedure("${@}");
    EXPECT_STREQ(line->procedure(), "");
}

TEST_F(ValidLogTest, TheProcedureKeepsItsInnerSpacesExceptATabAfterItsFirstWord) {
    EXPECT_STREQ(user(log + " ; ;U ;a  b\tc ;d ")->procedure(), "a  b\tc ;d ");
    EXPECT_STREQ(user(log + " ; ;U ;a\tb\tc")->procedure(), "a b\tc");
    EXPECT_STREQ(user(log + " ; ;U ;a ")->procedure(), "a");
    EXPECT_STREQ(user(log + " ; ;U ;a  ")->procedure(), "a  ");
}

TEST_F(ValidLogTest, AProcedureOfATypeThatHasNoneIsIgnored) {
    const auto line = user(log + " ;N ;S ;abc def");
    EXPECT_TRUE(line->isValid());
    EXPECT_STREQ(line->procedure(), "");
    EXPECT_THAT(trace.messages(), ElementsAre("Procedure parameter abc def not valid for file " +
                                              log + " which is of type S; parameter ignored. "));
    trace.clear();
    EXPECT_TRUE(user(log + " ; ;A ;x")->isValid());
    EXPECT_TRUE(user(log + " ; ; ;x")->isValid());
    EXPECT_THAT(trace.messages(), ElementsAre("Procedure parameter x not valid for file " + log +
                                                  " which is of type A; parameter ignored. ",
                                              "Procedure parameter x not valid for file " + log +
                                                  " which is of type S; parameter ignored. "));
}

TEST_F(ValidLogTest, AUserLogWithoutProcedureIsValid) {
    const auto line = user(log + " ;N ;U");
    EXPECT_TRUE(line->isValid());
    EXPECT_STREQ(line->procedure(), "");
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(ValidLogTest, AFieldWithoutSeparatorRefusesTheLine) {
    const std::string pathLength = std::to_string(log.size() - std::string("app.log").size());
    EXPECT_FALSE(user(log + " Y ;U")->isValid());
    EXPECT_FALSE(user(log + " ;Y S")->isValid());
    EXPECT_FALSE(user(log + " ;Y ;S ; x")->isValid());
    EXPECT_THAT(trace.messages(), ElementsAre("Field separator missing after field 1 for log " +
                                                  pathLength + ". Skipping rest of line.",
                                              "Field separator missing after field 2 for log " +
                                                  pathLength + ". Skipping rest of line.",
                                              "Field separator missing after field 4 for log " +
                                                  pathLength + ". Skipping rest of line."));
}

TEST_F(ValidLogTest, FurtherFieldsAreIgnored) {
    const auto line = user(log + " ;Y ;U ; ;five ; ;seven");
    EXPECT_TRUE(line->isValid());
    EXPECT_STREQ(line->procedure(), "");
    EXPECT_THAT(trace.messages(),
                ElementsAre("Field 5 for log " + log +
                                " is out of bounds. Maximum number of fields is 4. "
                                "Value of five is ignored",
                            "Field 7 for log " + log +
                                " is out of bounds. Maximum number of fields is 4. "
                                "Value of seven is ignored"));
}

TEST_F(ValidLogTest, TheNameCannotBeDefaulted) {
    EXPECT_FALSE(user("; ;N ;S")->isValid());
    EXPECT_FALSE(user(";" + log)->isValid());
    EXPECT_THAT(trace.messages(),
                ElementsAre("File name cannot be defaulted. Skipping rest of line.",
                            "File name cannot be defaulted. Skipping rest of line."));
}

TEST_F(ValidLogTest, ARelativeNameIsRefusedWithoutNamingIt) {
    EXPECT_FALSE(user("relative.log ;N ;S")->isValid());
    EXPECT_THAT(trace.messages(),
                ElementsAre("Absolute path name of log file must be specified for log . "
                            "Ignoring remainder of line."));
}

TEST_F(ValidLogTest, AMissingFileAndADirectoryAreRefused) {
    const std::string missing = directory.file("missing");
    const std::string path = directory.path();
    EXPECT_FALSE(user(missing + " ;N ;S")->isValid());
    EXPECT_FALSE(user(path)->isValid());
    EXPECT_THAT(trace.messages(), ElementsAre("stat() command failed for " + missing +
                                                  " errno = 2; No such file or directory.",
                                              "Ignoring remainder of line.",
                                              "The file " + path + " is not a regular file.",
                                              "Ignoring remainder of line."));
}

TEST_F(ValidLogTest, AFileModifiedAtTheEpochCountsAsMissing) {
    const utimbuf epoch{0, 0};
    ASSERT_EQ(utime(log.c_str(), &epoch), 0);
    EXPECT_FALSE(user(log)->isValid());
    EXPECT_THAT(trace.messages(), ElementsAre("Ignoring remainder of line."));
}

TEST_F(ValidLogTest, ANameThatHasNoLocalFormIsRefused) {
    LocaleDouble::setCodePage(0);
    EXPECT_FALSE(user(log)->isValid());
    EXPECT_THAT(trace.messages(), ElementsAre("Codepage return was 0; Not a valid codepage.",
                                              "No / character found in file name ."));
}

TEST_F(ValidLogTest, ANameThatItsConversionChangesIsRefused) {
    // The conversion turns the damaged character into the name of another, existing file.
    const std::string other = directory.write("cafx", "");
    const std::string damaged = directory.write("caf\xE9x", "");
    EXPECT_FALSE(user(damaged)->isValid());
    const std::string message = "The name of file " + damaged +
                                " is not kept by a conversion between UTF-8 and the local code "
                                "page. Ignoring remainder of line.";
    EXPECT_THAT(trace.messages(), ElementsAre(message));
    EXPECT_TRUE(user(other)->isValid());
    EXPECT_TRUE(user(directory.write("l\xC3\xB6g", ""))->isValid());
}

TEST_F(ValidLogTest, TheActionOfASyslogLineIsALog) {
    const auto line = syslog("*.err;kern.debug \t" + log + " more");
    EXPECT_TRUE(line->isValid());
    EXPECT_EQ(line->type(), 'S');
    EXPECT_EQ(line->debugMode(), 'N');
    EXPECT_EQ(line->fileNameLocal(), log);
    EXPECT_STREQ(line->procedure(), "");
}

TEST_F(ValidLogTest, TheActionOfASyslogLineIsInTheLocalCodePage) {
    const std::string name = directory.write("l\xF6g", "");
    const auto line = syslog("*.err " + name);
    EXPECT_EQ(line->fileNameLocal(), name);
    EXPECT_EQ(line->fileNameUTF8(), directory.file("l\xC3\xB6g"));
}

TEST_F(ValidLogTest, SyslogActionsThatAreNotFilesAreDroppedSilently) {
    trace.setLevel(TRC1_ERROR | TRC1_DETAIL);
    EXPECT_FALSE(syslog("*.alert root")->isValid());
    EXPECT_FALSE(syslog("*.emerg *")->isValid());
    EXPECT_FALSE(syslog("*.err @host")->isValid());
    EXPECT_FALSE(syslog("*.err -" + log)->isValid());
    EXPECT_THAT(trace.messages(), ElementsAre());
    const std::string missing = directory.file("missing");
    EXPECT_FALSE(syslog("*.err " + missing)->isValid());
    EXPECT_THAT(trace.messages(), ElementsAre("stat() command failed for " + missing +
                                              " errno = 2; No such file or directory."));
}

TEST_F(ValidLogTest, ASyslogLineWithoutActionIsReported) {
    EXPECT_FALSE(syslog("mail.debug")->isValid());
    EXPECT_THAT(trace.messages(), ElementsAre());
    trace.setLevel(TRC1_DETAIL);
    EXPECT_FALSE(syslog("mail.debug")->isValid());
    EXPECT_FALSE(syslog("")->isValid());
    const std::string discarded =
        "syslog line discarded. Expected format is: 'facility.priority[;facility.priority]', "
        "one or more tabs or spaces followed by an absolute file name.";
    EXPECT_THAT(trace.messages(), ElementsAre(discarded, discarded));
}

TEST_F(ValidLogTest, ASyslogActionThatHasNoUTF8FormIsStillALog) {
    LocaleDouble::setCodePage(0);
    EXPECT_TRUE(syslog("*.err " + log)->isValid());
}

TEST_F(ValidLogTest, TheFirstLineForAFileWins) {
    const std::string other = directory.write("other.log", "");
    const auto head = user(log + " ;Y");
    const auto second = user(other, head.get());
    const auto third = user(other + " ;Y ;A", head.get());
    const auto fourth = syslog("*.err " + log, head.get());
    EXPECT_TRUE(second->isValid());
    EXPECT_FALSE(third->isValid());
    EXPECT_FALSE(fourth->isValid());
    EXPECT_EQ(head->next(), second.get());
    EXPECT_EQ(second->next(), head.get());
    EXPECT_THAT(trace.messages(), ElementsAre("Duplicate " + other + " entry found; entry ignored.",
                                              "Duplicate " + log + " entry found; entry ignored."));
}

TEST_F(ValidLogTest, NamesAreComparedExactly) {
    const std::string upper = directory.write("APP.LOG", "");
    const auto head = user(log);
    EXPECT_TRUE(user(upper, head.get())->isValid());
}

TEST_F(ValidLogTest, AValidLineLeavesItsChain) {
    const std::string other = directory.write("other.log", "");
    const auto head = user(log);
    auto second = user(other, head.get());
    auto refused = user(other, head.get());
    second.reset();
    refused.reset();
    EXPECT_EQ(head->next(), head.get());
    EXPECT_EQ(head->prev(), head.get());
}

TEST_F(ValidLogTest, AnUnknownOriginIsRefused) {
    EXPECT_FALSE(parse(static_cast<WhenceConfig>('x'), log)->isValid());
    EXPECT_THAT(trace.messages(), ElementsAre("Constructor invoked with invalid argument: 120"));
}

TEST_F(ValidLogTest, AValidLineIsDumpedInTheFineClass) {
    trace.setLevel(TRC1_FINE);
    const auto line = user(log);
    EXPECT_FALSE(user("relative")->isValid());
    ASSERT_EQ(trace.messages().size(), 2U);
    EXPECT_THAT(trace.messages()[0], HasSubstr("LogFileNameLocal\t= \"" + log + "\""));
    EXPECT_EQ(trace.messages()[1], "\n\tValid\t\t\t= 1\n");
}

TEST_F(ValidLogTest, PrintSelfIsWrittenWhateverTheLevel) {
    const auto line = user("relative");
    trace.clear();
    trace.setLevel(0);
    line->printSelf();
    ASSERT_EQ(trace.messages().size(), 2U);
    EXPECT_THAT(trace.messages()[0], HasSubstr("LogFileNameLocal\t= \"\""));
    EXPECT_EQ(trace.messages()[1], "\n\tValid\t\t\t= 0\n");
}

using ValidLogDeathTest = ValidLogTest;

TEST_F(ValidLogDeathTest, RunningOutOfMemoryInASubstitutionEndsTheProcess) {
    const auto line = user(log + " ; ;U");
    const std::string size = std::to_string(log.size() + 2);
    EXPECT_EXIT(
        {
            Fault fault("new", ENOMEM);
            line->setLogProcedure("x${@}");
            std::exit(0);
        },
        ExitedWithCode(255),
        "^Memory allocation of " + size + " bytes failed\\. Agent is terminating\\.\n$");
}

} // namespace
