#include "host/start/CommandLine.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "support/ReasonOf.h"

using namespace zrm::host;

namespace {

CommandLine read(const std::vector<const char*>& arguments) {
    return CommandLine::parse(arguments).value();
}

std::string refused(const std::vector<const char*>& arguments) {
    return reasonOf(CommandLine::parse(arguments));
}

TEST(CommandLine, MayBeEmpty) {
    const CommandLine line = read({});
    EXPECT_EQ(line.config(), "");
    EXPECT_EQ(line.traceFile(), "");
    EXPECT_FALSE(line.wantsHelp());
    EXPECT_FALSE(line.wantsVersion());
}

TEST(CommandLine, ReadsFilesInBothForms) {
    const CommandLine apart = read({"--config", "/etc/a.toml", "--trace-file", "/tmp/trace"});
    EXPECT_EQ(apart.config(), "/etc/a.toml");
    EXPECT_EQ(apart.traceFile(), "/tmp/trace");
    const CommandLine joined = read({"--trace-file=a=b", "--config=c"});
    EXPECT_EQ(joined.config(), "c");
    EXPECT_EQ(joined.traceFile(), "a=b");
}

TEST(CommandLine, ReadsHelpAndVersion) {
    EXPECT_TRUE(read({"--help"}).wantsHelp());
    EXPECT_TRUE(read({"--version"}).wantsVersion());
}

TEST(CommandLine, RefusesEverythingElse) {
    EXPECT_EQ(refused({"--frobnicate"}), "unknown argument '--frobnicate'");
    EXPECT_EQ(refused({"--conf=x"}), "unknown argument '--conf=x'");
    EXPECT_EQ(refused({"file"}), "unknown argument 'file'");
    EXPECT_EQ(refused({""}), "unknown argument ''");
    EXPECT_EQ(refused({"--config"}), "--config needs a file name");
    EXPECT_EQ(refused({"--config", ""}), "--config needs a file name");
    EXPECT_EQ(refused({"--trace-file="}), "--trace-file needs a file name");
    EXPECT_EQ(refused({"--help=yes"}), "--help takes no value");
    EXPECT_EQ(refused({"--version", "--frobnicate"}), "unknown argument '--frobnicate'");
}

TEST(CommandLine, TheHelpNamesEveryOption) {
    EXPECT_EQ(CommandLine::help(),
              "Usage: zrmagent [OPTION]...\n"
              "Watches log files and reports their new entries as events.\n"
              "\n"
              "  --config FILE       host configuration (default /etc/zrm/zrm.toml if it exists)\n"
              "  --trace-file FILE   append the trace to FILE instead of standard error\n"
              "  --version           print the version and exit\n"
              "  --help              print this help and exit\n"
              "\n"
              "Signals: HUP re-reads the log configuration, INT and TERM stop the agent.\n"
              "Exit status: 0 after an orderly stop, 2 for an unusable command line or "
              "configuration,\n"
              "255 after a failure.\n");
}

} // namespace
