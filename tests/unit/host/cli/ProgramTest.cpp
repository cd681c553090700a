#include "host/cli/Program.h"

#include "ProgramTest.h"
#include "host/cli/CliError.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cstdlib>
#include <functional>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

using namespace zrm::host;

namespace {

using testing::EndsWith;
using testing::HasSubstr;

TEST_F(ProgramTest, AnUnexpectedAnswerCrashesNoCommand) {
    const std::vector<std::vector<std::string>> commands = {
        {"status"},
        {"logs"},
        {"logs", "/x"},
        {"events"},
        {"report", "/x"},
        {"report", "/x", "--format", "csv"},
        {"report", "/x", "--columns", "ENTRYDESC"},
        {"situations"},
        {"situations", "show", "x"},
        {"situations", "add", "x"},
        {"situations", "set", "x", "--text", "a"},
        {"explain", "x", "--event", "1"},
        {"backtest", "x"},
        {"trace"},
        {"trace", "error"},
    };
    const std::vector<std::string> bodies = {
        "{}",
        "[]",
        "null",
        "1",
        R"("x")",
        R"({"columns":1,"rows":{"a":1},"logs":5,"events":{"a":{"id":-1}},"situations":"x",)"
        R"("newest":"q","explanations":7,"raised_at":3,"truncated":[]})",
        R"({"rows":[1,2],"columns":[1],"events":[1],"logs":[[]],"situations":[null],)"
        R"("explanations":[[]],"raised_at":[1]})",
        "{\"begin\":1}\n{\"row\":1}\n{\"progress\":1}\n{\"end\":1}\n",
        "{\"row\":[]}\n{\"end\":{\"files\":{\"a\":1},\"skipped\":\"x\",\"truncated\":{}}}\n"};
    for (const std::string& body : bodies) {
        answerWith(body);
        for (const std::vector<std::string>& command : commands) {
            const CliStatus status = run(command);
            EXPECT_TRUE(body[0] == '{' ? status <= CliStatus::UNREACHABLE
                                       : status == CliStatus::UNREACHABLE)
                << command.front() << " with " << body << ": " << static_cast<int>(status)
                << errors;
        }
    }
    answerWith("{\"begin\":{\"columns\":1}}\n{\"end\":{}}\n");
    EXPECT_EQ(run({"report", "/x", "--format", "csv"}), CliStatus::UNREACHABLE);
    EXPECT_EQ(errors, "zrmctl: what answers is not a zrmagent of this version: its answer has a "
                      "different form\n");
}

TEST_F(ProgramTest, AnUnknownColumnOfAReportIsRefused) {
    answerWith("{\"begin\":{\"columns\":[\"ENTRYTIME\",\"ENTRYDESC\"]}}\n"
               "{\"row\":{\"ENTRYDESC\":\"a, b\"}}\n{\"end\":{\"count\":1}}\n");
    EXPECT_EQ(run({"report", "/x", "--columns", "ENTRYDESC,BOGUS"}), CliStatus::USAGE);
    EXPECT_EQ(output, "");
    EXPECT_EQ(errors, "zrmctl: --columns: 'BOGUS' is not a column; the columns are ENTRYTIME, "
                      "ENTRYDESC\n");
    EXPECT_EQ(run({"report", "/x", "--format", "csv", "--columns", "entrydesc"}), CliStatus::DONE);
    EXPECT_EQ(output, "ENTRYDESC\r\n\"a, b\"\r\n");
    EXPECT_EQ(run({"report", "/x", "--json", "--columns", "ENTRYDESC"}), CliStatus::DONE);
    EXPECT_EQ(output,
              "{\"columns\":[\"ENTRYDESC\"],\"rows\":[{\"ENTRYDESC\":\"a, b\"}],\"count\":1}\n");
}

TEST_F(ProgramTest, ReadsTheNumberOfAnEvent) {
    for (const char* const number :
         {"99999999999999999999999", "9223372036854775808", "1.5", "-1", "x", "", " 1", "1x"}) {
        EXPECT_EQ(run({"events", "-f", "--after", number}), CliStatus::USAGE) << number;
        EXPECT_EQ(errors,
                  "zrmctl: --after: '" + std::string(number) +
                      "' is not the id of an event; zrmctl events --help lists its options\n");
        EXPECT_EQ(run({"events", "--before", number}), CliStatus::USAGE) << number;
    }
    answerWith(R"({"events":[{"id":8}]})");
    EXPECT_EQ(run({"events", "--json", "--after", "9223372036854775807"}), CliStatus::DONE);
    EXPECT_EQ(output, "{\"id\":8}\n");
}

TEST_F(ProgramTest, InvalidUtf8IsRefused) {
    std::atomic<bool> isAsked{false};
    answerBy([&](const HttpRequest&) {
        isAsked = true;
        return HttpAnswer::json("{}");
    });
    for (const std::vector<std::string>& command :
         {std::vector<std::string>{"situations", "add", "caf\xe9"},
          {"situations", "add", "x", "--text", "caf\xe9"},
          {"explain", "x", "--line", "caf\xe9"},
          {"report", "/x", "--where", "ENTRYDESC = '\xff'"}}) {
        EXPECT_EQ(run(command), CliStatus::USAGE);
        EXPECT_EQ(errors, "zrmctl: the command line, or the file that it names, is not valid "
                          "UTF-8, which the agent's API requires\n");
    }
    EXPECT_FALSE(isAsked);
}

TEST_F(ProgramTest, ExactlyOneSubjectIsExplained) {
    std::string asked;
    answerBy([&](const HttpRequest& request) {
        asked = request.body;
        return HttpAnswer::json(R"({"explanations":[{}]})");
    });
    EXPECT_EQ(run({"explain", "x"}), CliStatus::DONE);
    EXPECT_EQ(copy(asked), R"({"situation":"x","last":5})");
    EXPECT_EQ(run({"explain", "x", "--line", "a b"}), CliStatus::DONE);
    EXPECT_EQ(copy(asked), R"({"situation":"x","line":"a b"})");
    EXPECT_EQ(run({"explain", "x", "--log", "/l", "--last", "7"}), CliStatus::DONE);
    EXPECT_EQ(copy(asked), R"({"situation":"x","log":"/l","last":7})");
    EXPECT_EQ(run({"explain", "x", "--event", "7"}), CliStatus::DONE);
    EXPECT_EQ(copy(asked), R"({"situation":"x","event":7})");
    for (const std::vector<std::string>& both :
         {std::vector<std::string>{"explain", "x", "--line", "a", "--last", "2"},
          {"explain", "x", "--event", "1", "--last", "2"},
          {"explain", "x", "--event", "1", "--log", "/l"}}) {
        EXPECT_EQ(run(both), CliStatus::USAGE);
        EXPECT_THAT(errors, HasSubstr("explain one thing"));
    }
}

TEST_F(ProgramTest, AnEmptyValueRemovesAMember) {
    std::string put;
    answerBy([&](const HttpRequest& request) {
        put = request.method == "PUT" ? request.body : put;
        return HttpAnswer::json(
            R"({"name":"x","text":"t","severity":"info","log":"/l",)"
            R"("when":["a"],"frequency":">= 5","period":"60s","state":"running"})");
    });
    EXPECT_EQ(run({"situations", "set", "x", "--frequency", "", "--period", ""}), CliStatus::DONE);
    EXPECT_EQ(copy(put), R"({"name":"x","text":"t","severity":"info","log":"/l","when":["a"]})");
    EXPECT_EQ(run({"situations", "set", "x", "--log", "", "--when", "", "--severity", "major"}),
              CliStatus::DONE);
    EXPECT_EQ(copy(put), R"({"name":"x","text":"t","severity":"major","frequency":">= 5",)"
                         R"("period":"60s"})");
    EXPECT_EQ(run({"situations", "set", "x"}), CliStatus::USAGE);
}

TEST_F(ProgramTest, AnErrorNamesTheHelpToRead) {
    EXPECT_EQ(run({"situations", "bogus"}), CliStatus::USAGE);
    EXPECT_THAT(errors, EndsWith("; zrmctl situations --help lists its options\n"));
    EXPECT_EQ(run({"situations", "show"}), CliStatus::USAGE);
    EXPECT_THAT(errors, EndsWith("; zrmctl situations show --help lists its options\n"));
    EXPECT_EQ(run({"bogus"}), CliStatus::USAGE);
    EXPECT_EQ(errors,
              "zrmctl: 'bogus' is not a command; zrmctl --help lists commands and options\n");
    for (const char* const help : {"-h", "--help"}) {
        EXPECT_EQ(run({"report", help}), CliStatus::DONE);
        EXPECT_THAT(output, HasSubstr("--columns"));
    }
}

TEST_F(ProgramTest, AnEndlessDefinitionIsRefused) {
    EXPECT_EQ(run({"backtest", "--file", "/dev/zero"}), CliStatus::USAGE);
    EXPECT_EQ(errors, "zrmctl: /dev/zero is larger than 16 MiB, the most that is read\n");
    EXPECT_EQ(run({"situations", "add", "x", "--file", directory.path().string()}),
              CliStatus::USAGE);
    EXPECT_EQ(errors, "zrmctl: cannot read " + directory.path().string() + ": Is a directory\n");
}

TEST_F(ProgramTest, AFileWithoutCertificatesIsRefused) {
    const std::string empty = directory.write("empty.pem", "nothing\n");
    const std::string url = "https://127.0.0.1:1";
    EXPECT_EQ(run({"--url", url, "--ca-file", empty, "logs"}), CliStatus::USAGE);
    EXPECT_EQ(errors, "zrmctl: " + empty + " does not contain a certificate in PEM format\n");
    const std::string absent = directory.file("absent.pem");
    EXPECT_EQ(run({"--url", url, "--ca-file", absent, "logs"}), CliStatus::USAGE);
    EXPECT_EQ(errors, "zrmctl: cannot read " + absent + ": No such file or directory\n");
}

} // namespace
