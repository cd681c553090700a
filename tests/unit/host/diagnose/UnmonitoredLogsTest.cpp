#include "host/diagnose/UnmonitoredLogs.h"

#include "host/base/JsonWriter.h"

#include "support/TemporaryDirectory.h"

#include <cstdlib>

#include <gmock/gmock.h>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

std::string configurationOf(const UnmonitoredLogs::Result& result) {
    return JsonWriter::text([&](JsonWriter& json) { result.writeConfiguration(json); });
}

class UnmonitoredLogsTest : public testing::Test {
protected:
    static std::vector<std::string> describe(const std::vector<UnmonitoredLogs::Log>& logs) {
        std::vector<std::string> texts;
        for (const UnmonitoredLogs::Log& log : logs) {
            texts.push_back(std::to_string(log.line) + " " + log.log + " " + log.cause + ": " +
                            log.reason);
        }
        return texts;
    }

    TemporaryDirectory m_directory;
    std::string m_there = m_directory.write("there.log", "");
    std::string m_gone = m_directory.file("gone.log");
};

TEST_F(UnmonitoredLogsTest, HasNoneWhenAllLogsAreMonitored) {
    EXPECT_THAT(UnmonitoredLogs::find("", {}), IsEmpty());
    EXPECT_THAT(UnmonitoredLogs::find("# none\n\n", {}), IsEmpty());
    EXPECT_THAT(UnmonitoredLogs::find("# one\n\t" + m_there + "\t;N ;S\n", {m_there}), IsEmpty());
}

TEST_F(UnmonitoredLogsTest, ReportsWhyWithTheLineNumber) {
    const std::string text = "# logs\n" + m_there + " ;N ;S\n  " + m_gone +
                             " ;N ;S\nrelative.log\n" + m_directory.path().string() + "\n";
    EXPECT_THAT(
        describe(UnmonitoredLogs::find(text, {m_there})),
        ElementsAre("3 " + m_gone + " file: The file cannot be used: No such file or directory.",
                    "4 relative.log text: Absolute path name of log file must be specified "
                    "for log . Ignoring remainder of line.",
                    "5 " + m_directory.path().string() +
                        " file: The file cannot be used: It is not a regular file."));
}

TEST_F(UnmonitoredLogsTest, IncludesALogThatOnlyNeedsARefresh) {
    EXPECT_THAT(describe(UnmonitoredLogs::find(m_there + "\n", {})),
                ElementsAre("1 " + m_there + " refresh: The agent has not read this line yet."));
}

TEST_F(UnmonitoredLogsTest, SaysWhatHelpsWhenARefreshWouldNotMonitorALog) {
    const auto logs = UnmonitoredLogs::find(m_there + "\n", {}, true);
    EXPECT_THAT(describe(logs), ElementsAre(testing::StartsWith("1 " + m_there + " touch: ")));
    EXPECT_THAT(logs[0].reason, testing::EndsWith("Touch the configuration, then refresh."));
}

TEST_F(UnmonitoredLogsTest, NamesALogOnce) {
    const std::string line = m_gone + " ;N ;S\n";
    EXPECT_THAT(UnmonitoredLogs::find(line + line, {}), SizeIs(1));
    // Its second line is refused, but the log is read.
    EXPECT_THAT(UnmonitoredLogs::find(m_there + "\n" + m_there + " ;Y\n", {m_there}), IsEmpty());
}

TEST_F(UnmonitoredLogsTest, ANameIsAlwaysUtf8) {
    const auto logs = UnmonitoredLogs::find("/none/\xC3\xA4\n/none/\xE4\n", {});
    ASSERT_THAT(logs, SizeIs(2));
    EXPECT_EQ(logs[0].log, "/none/\xC3\xA4");
    EXPECT_EQ(logs[1].log, "/none/\xEF\xBF\xBD");
}

TEST_F(UnmonitoredLogsTest, AnUnreadableConfigurationIsReported) {
    const std::string configuration = m_directory.file("logs.conf");
    ASSERT_EQ(setenv("ZRM_CONFIG_FILE", configuration.c_str(), 1), 0);
    UnmonitoredLogs::Result result = UnmonitoredLogs::read();
    EXPECT_EQ(configurationOf(result),
              "{\"file\":\"" + configuration + "\",\"problem\":\"No such file or directory\"}");
    m_directory.write("logs.conf", m_gone + " ;N\n");
    result = UnmonitoredLogs::read();
    EXPECT_EQ(configurationOf(result), "{\"file\":\"" + configuration + "\",\"problem\":null}");
    ASSERT_THAT(result.logs, SizeIs(1));
    EXPECT_THAT(
        JsonWriter::text([&](JsonWriter& json) { result.logs[0].write(json); }),
        HasSubstr("{\"log\":\"" + m_gone + "\",\"line\":1,\"reason\":\"The file cannot be used"));
    ASSERT_EQ(setenv("ZRM_CONFIG_FILE", m_directory.path().c_str(), 1), 0);
    EXPECT_EQ(UnmonitoredLogs::read().problem, Problem{"It is not a regular file"});
    unsetenv("ZRM_CONFIG_FILE");
    EXPECT_EQ(configurationOf(UnmonitoredLogs::read()), "null");
}

} // namespace
