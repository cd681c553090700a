#include "host/diagnose/ConfigCheck.h"

#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <string>

#include <utime.h>

using namespace zrm::host;

namespace {

using testing::EndsWith;
using testing::HasSubstr;
using Cause = ConfigCheck::Cause;
using Verdict = ConfigCheck::Verdict;

class ConfigCheckTest : public testing::Test {
protected:
    /// The verdict on one line, which is ended.
    static ConfigCheck::Line judge(const std::string& line) {
        const ConfigCheck::Result result = ConfigCheck::check(line + "\n");
        EXPECT_EQ(result.lines.size(), 1U);
        return result.lines.at(0);
    }

    TemporaryDirectory m_directory;
    std::string m_path = m_directory.write("app.log", "");
};

TEST_F(ConfigCheckTest, AnEmptyTextHasNoLines) {
    const ConfigCheck::Result result = ConfigCheck::check("");
    EXPECT_TRUE(result.lines.empty());
    EXPECT_EQ(result.accepted, 0U);
    EXPECT_EQ(result.refused, 0U);
}

TEST_F(ConfigCheckTest, GivesEachLineItsNumberAndVerdict) {
    const std::string other = m_directory.write("other.log", "");
    const ConfigCheck::Result result = ConfigCheck::check(
        "# logs\n\n   \n" + m_path + "\n  " + other + " ;Y ;S\nrelative.log\n  # no comment\n");
    std::vector<Verdict> verdicts;
    for (std::size_t i = 0; i < result.lines.size(); ++i) {
        EXPECT_EQ(result.lines[i].number, i + 1);
        verdicts.push_back(result.lines[i].verdict);
    }
    EXPECT_THAT(verdicts, testing::ElementsAre(Verdict::IGNORED, Verdict::IGNORED, Verdict::IGNORED,
                                               Verdict::ACCEPTED, Verdict::ACCEPTED,
                                               Verdict::REFUSED, Verdict::REFUSED));
    EXPECT_EQ(result.accepted, 2U);
    EXPECT_EQ(result.refused, 2U);
    EXPECT_EQ(result.lines[4].text, "  " + other + " ;Y ;S");
    EXPECT_EQ(result.lines[4].log, other);
    EXPECT_EQ(result.lines[4].reason, "");
}

TEST_F(ConfigCheckTest, ReportsTheAgentsOwnMessages) {
    const ConfigCheck::Line relative = judge("relative.log ;N ;S");
    EXPECT_EQ(relative.reason, "Absolute path name of log file must be specified for log . "
                               "Ignoring remainder of line.");
    EXPECT_EQ(relative.cause, Cause::TEXT);
    EXPECT_EQ(relative.log, "");
    const ConfigCheck::Line type = judge(m_path + " ;Y ;Q");
    EXPECT_EQ(type.reason,
              "Log type of Q for log " + m_path + " is invalid. Ignoring remainder of line.");
    EXPECT_EQ(type.cause, Cause::TEXT);
    EXPECT_EQ(judge(m_path + " ;N ;E").reason, "Errlogs are valid only on AIX.  Ignoring line.");
}

TEST_F(ConfigCheckTest, AMissingFileIsReportedAsAFileError) {
    const ConfigCheck::Line line = judge("/none/such.log");
    EXPECT_EQ(line.verdict, Verdict::REFUSED);
    EXPECT_EQ(line.cause, Cause::FILE);
    EXPECT_EQ(line.log, "/none/such.log");
    EXPECT_EQ(line.reason, "The file cannot be used: No such file or directory.");
    EXPECT_EQ(judge("/tmp").reason, "The file cannot be used: It is not a regular file.");
    const utimbuf epoch{0, 0};
    ASSERT_EQ(utime(m_path.c_str(), &epoch), 0);
    const ConfigCheck::Line old = judge(m_path);
    EXPECT_EQ(old.cause, Cause::FILE);
    EXPECT_THAT(old.reason, HasSubstr("1970"));
}

TEST_F(ConfigCheckTest, ALinesLengthIncludesTheExpandedNames) {
    std::string format = "A , \"";
    for (int i = 0; i < 200; ++i) {
        format += "${@}";
    }
    const ConfigCheck::Line line = judge(m_path + " ;N ;U ;" + format + "%s\" , type");
    EXPECT_EQ(line.verdict, Verdict::REFUSED);
    EXPECT_EQ(line.cause, Cause::TEXT);
    const std::size_t length = std::string("A , \"%s\" , type").size() + 200 * m_path.size();
    EXPECT_EQ(line.reason, "With each ${@} replaced by the log's name the format has " +
                               std::to_string(length) +
                               " characters; it may have 1022. Write the name in fewer places.");
    EXPECT_EQ(judge(m_path + R"( ;N ;U ;A , "${@} %s" , type)").verdict, Verdict::ACCEPTED);
}

TEST_F(ConfigCheckTest, ANameThatConversionWouldChangeIsRefused) {
    // A damaged character becomes a longer one, and the name is cut where the room ends.
    m_directory.write("caf", "");
    const ConfigCheck::Line line = judge(m_directory.write("caf\xE9", ""));
    EXPECT_EQ(line.verdict, Verdict::REFUSED);
    EXPECT_THAT(line.reason, HasSubstr("is not kept by a conversion"));
}

TEST_F(ConfigCheckTest, AFileOutsideTheDirectoriesIsNotExamined) {
    const std::string directory = m_directory.path().string() + "/";
    std::filesystem::create_directory(directory + "sub");
    m_directory.write("sub/app.log", "");
    const auto verdictOn = [&](const std::string& path) {
        const ConfigCheck::Result result = ConfigCheck::check(path + " ;N\n", {directory});
        const ConfigCheck::Line& line = result.lines.at(0);
        EXPECT_EQ(result.accepted + result.refused, line.verdict == Verdict::OUTSIDE ? 0U : 1U);
        return std::string(ConfigCheck::name(line.verdict));
    };
    EXPECT_EQ(verdictOn(m_path), "accepted");
    EXPECT_EQ(verdictOn("/" + directory + "/app.log"), "accepted");
    EXPECT_EQ(verdictOn(directory + "none.log"), "refused");
    EXPECT_EQ(verdictOn("relative.log"), "refused");
    for (const std::string& outside :
         {std::string("/etc/passwd"), std::string("/none/such.log"), std::string("/"),
          directory.substr(0, directory.size() - 1), directory + "sub/app.log",
          directory + "sub/../app.log", directory + "../none", directory + "./app.log",
          directory + ".."}) {
        EXPECT_EQ(verdictOn(outside), "outside") << outside;
    }
    const ConfigCheck::Result there = ConfigCheck::check("/etc/passwd ;N ;U ;x\n", {directory});
    const ConfigCheck::Result missing = ConfigCheck::check("/etc/missing ;N ;U ;x\n", {directory});
    EXPECT_EQ(there.lines[0].reason, missing.lines[0].reason);
    EXPECT_EQ(there.lines[0].cause, Cause::NONE);
    EXPECT_EQ(missing.lines[0].cause, Cause::NONE);
}

TEST_F(ConfigCheckTest, AnAcceptedLineKeepsItsWarning) {
    const ConfigCheck::Line line = judge(m_path + " ;N ;S ;abc");
    EXPECT_EQ(line.verdict, Verdict::ACCEPTED);
    EXPECT_EQ(line.cause, Cause::NONE);
    EXPECT_EQ(line.reason, "Procedure parameter abc not valid for file " + m_path +
                               " which is of type S; parameter ignored. ");
}

TEST_F(ConfigCheckTest, TheFirstLineOfAFileWins) {
    const ConfigCheck::Result result = ConfigCheck::check(m_path + "\n" + m_path + " ;Y\n");
    EXPECT_EQ(result.lines[0].verdict, Verdict::ACCEPTED);
    EXPECT_EQ(result.lines[1].verdict, Verdict::REFUSED);
    EXPECT_EQ(result.lines[1].reason, "Duplicate " + m_path + " entry found; entry ignored.");
}

TEST_F(ConfigCheckTest, AFormatThatCannotBeLearnedIsRefused) {
    const ConfigCheck::Line bad = judge(m_path + R"( ;N ;U ;A , "%q" , type)");
    EXPECT_EQ(bad.verdict, Verdict::REFUSED);
    EXPECT_EQ(bad.cause, Cause::TEXT);
    EXPECT_THAT(bad.reason, HasSubstr("Invalid convcode or receiving variable size specified"));
    EXPECT_THAT(bad.reason, EndsWith("Error occurred while interpreting format command for file " +
                                     m_path + "; monitoring not started. "));
    EXPECT_EQ(judge(m_path + " ;N ;U").verdict, Verdict::REFUSED);
    EXPECT_EQ(judge(m_path + R"( ;N ;U ;A , "%s" , type)").verdict, Verdict::ACCEPTED);
}

TEST_F(ConfigCheckTest, ReportsTheLinesThatTheAgentSkips) {
    const ConfigCheck::Result last = ConfigCheck::check(m_path);
    EXPECT_EQ(last.lines[0].verdict, Verdict::REFUSED);
    EXPECT_THAT(last.lines[0].reason, HasSubstr("without a newline"));
    EXPECT_EQ(ConfigCheck::check("# only a comment").lines[0].verdict, Verdict::IGNORED);
    const ConfigCheck::Line tooLong = judge(m_path + std::string(1024, ' '));
    EXPECT_EQ(tooLong.verdict, Verdict::REFUSED);
    EXPECT_THAT(tooLong.reason, HasSubstr("1023"));
    EXPECT_EQ(judge(m_path + std::string(1022 - m_path.size(), ' ')).verdict, Verdict::ACCEPTED);
    EXPECT_EQ(judge(m_path + std::string(1023 - m_path.size(), ' ')).verdict, Verdict::REFUSED);
}

TEST_F(ConfigCheckTest, TheRestOfALongCommentIsALine) {
    const ConfigCheck::Result result =
        ConfigCheck::check("#" + std::string(1022, '#') + m_path + "\n" + m_path + "\n");
    EXPECT_EQ(result.lines[0].verdict, Verdict::ACCEPTED);
    EXPECT_EQ(result.lines[0].log, m_path);
    EXPECT_EQ(result.lines[1].verdict, Verdict::REFUSED);
}

TEST_F(ConfigCheckTest, ANulCharacterJoinsTheNextLine) {
    const std::string nul(1, '\0');
    const ConfigCheck::Result result =
        ConfigCheck::check(m_path + nul + "\n" + m_path + "\n" + m_path + "\n");
    EXPECT_EQ(result.lines[0].verdict, Verdict::REFUSED);
    EXPECT_EQ(result.lines[1].verdict, Verdict::REFUSED);
    EXPECT_EQ(result.lines[2].verdict, Verdict::ACCEPTED);
}

TEST_F(ConfigCheckTest, WritesJson) {
    EXPECT_EQ(ConfigCheck::json(ConfigCheck::check("# a\nb.log\n")),
              R"({"lines":[{"line":1,"text":"# a","verdict":"ignored","log":null,"reason":null,)"
              R"("cause":null},{"line":2,"text":"b.log","verdict":"refused","log":null,"reason":)"
              R"("Absolute path name of log file must be specified for log . Ignoring remainder )"
              R"(of line.","cause":"text"}],"accepted":0,"refused":1})");
}

} // namespace
