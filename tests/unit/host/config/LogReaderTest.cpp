#include "LogTables.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

TEST(LogReader, APathAloneIsASyslogFileFollowedByName) {
    const std::vector<LogConfig> logs = logsOf("\n[[log]]\npath = '/var/log/syslog'\n");
    ASSERT_EQ(logs.size(), 1U);
    LogConfig expected;
    expected.paths = {"/var/log/syslog"};
    expected.line = 2;
    EXPECT_EQ(logs[0], expected);
    EXPECT_TRUE(logs[0].follow.resume);
    EXPECT_EQ(logs[0].follow.rotateWait, std::chrono::seconds(2));
}

TEST(LogReader, RefusesToUnwrapTheFormatLanguage) {
    EXPECT_THAT(
        problemsOf("[[log]]\npath = '/a'\ntype = 'text'\nformat = 'A,\"%255[^\\n]\" , "
                   "description'\nunwrap = 'cri'\n"),
        ElementsAre("zrm.toml:5: log.unwrap: has no meaning for type \"text\"; describe what "
                    "the program writes by an expression: type = \"regex\""));
}

TEST(LogReader, ReadsWhatEventsKeepOfTheirEntries) {
    const EntryKeep usual = logsOf("[[log]]\npath = '/a'\n")[0].follow.keep;
    EXPECT_EQ(usual.fields, std::nullopt);
    EXPECT_EQ(usual.textBytes, 65536U);
    const EntryKeep keep =
        logsOf("[[log]]\npath = '/a'\nkeep = ['user', '*']\nentry_bytes = 0\n")[0].follow.keep;
    EXPECT_EQ(keep.fields, (std::vector<std::string>{"user", "*"}));
    EXPECT_EQ(keep.textBytes, 0U);
    EXPECT_EQ(logsOf("[[log]]\npath = '/a'\nkeep = []\n")[0].follow.keep.fields,
              std::vector<std::string>{});
}

TEST(LogReader, RefusesWhatEventsCannotKeep) {
    EXPECT_THAT(
        problemsOf("[[log]]\npath = '/a'\nkeep = ['', 'field.user']\nentry_bytes = 65537\n"),
        ElementsAre("zrm.toml:3: log.keep: '' is not the name of a field; write 1 to 255 "
                    "bytes",
                    "zrm.toml:3: log.keep: 'field.user' begins with 'field.'; write 'user'",
                    "zrm.toml:4: log.entry_bytes: 65537 is out of bounds; write a number "
                    "from 0 to 65536"));
    EXPECT_EQ(problemsOf("[[log]]\npath = '/a'\ntype = 'accounting'\nkeep = 'a'\nentry_bytes = 1\n")
                  .size(),
              2U);
    EXPECT_EQ(problemsOf("[[log]]\npath = '/a'\ntype = 'text'\nkeep = 'a'\nformat = "
                         "'A,\"%d %255[^\\n]\" , year description'\n")
                  .size(),
              1U);
}

TEST(LogReader, ReadsWhichLinesMakeAnEntry) {
    EXPECT_FALSE(logsOf("[[log]]\npath = '/a'\n")[0].follow.join);
    const auto log = logsOf("[[log]]\npath = '/a'\nentry = { starts = '^\\d', lines = 9, bytes = "
                            "99, wait = '3s' }\n")[0];
    ASSERT_TRUE(log.follow.join);
    EXPECT_EQ(log.letter, 'S') << "the columns are those of a syslog file";
    EXPECT_TRUE(log.follow.join->joins("1", "a"));
    EXPECT_FALSE(log.follow.join->joins("a", "1"));
    EXPECT_EQ(log.follow.join->limits().lines, 9U);
    EXPECT_EQ(log.follow.join->limits().bytes, 99U);
    EXPECT_EQ(log.follow.join->limits().wait, std::chrono::seconds(3));
    const auto text = logsOf("[[log]]\npath = '/a'\ntype = 'text'\nentry.indented = true\nformat = "
                             "'A,\"%d %255[^\\n]\" , year description'\n")[0];
    ASSERT_TRUE(text.follow.join);
    EXPECT_TRUE(text.follow.join->joins("a", " b"));
}

TEST(LogReader, RefusesLinesThatMakeNoEntry) {
    const std::string log = "[[log]]\npath = '/a'\n";
    EXPECT_THAT(
        problemsOf(log + "entry = { starts = '(' }\n"),
        ElementsAre("zrm.toml:3: log.entry.starts: '(' is not a regular expression: missing "
                    "): (; see github.com/google/re2/wiki/Syntax"));
    EXPECT_THAT(problemsOf(log + "entry = { lines = 5 }\n"),
                ElementsAre("zrm.toml:3: log.entry: does not say which lines make an entry; write "
                            "starts, continues or indented = true, for example { starts = "
                            "'^\\d{4}-' }"));
    EXPECT_THAT(
        problemsOf(
            log + "[log.entry]\nindented = true\nlines = 1\nbytes = 65537\nwait = '2m'\nend = 1\n"),
        ElementsAre("zrm.toml:5: log.entry.lines: 1 is not between 2 and 10000; write a number in "
                    "that range",
                    "zrm.toml:6: log.entry.bytes: 65537 is not between 2 and 65536; write a number "
                    "in that range",
                    "zrm.toml:7: log.entry.wait: '2m' is not a duration from a second to a minute; "
                    "write for example \"2s\"",
                    HasSubstr("zrm.toml:8: log.entry.end: ")));
    EXPECT_THAT(problemsOf(log + "entry = { starts = 'a', continues = 'b' }\n"),
                ElementsAre("zrm.toml:3: log.entry: says in more than one way which lines make an "
                            "entry; keep one of starts, continues and indented"));
    EXPECT_THAT(problemsOf(log + "entry = { starts = '' }\n"),
                ElementsAre("zrm.toml:3: log.entry.starts: is empty; write a regular expression"));
    EXPECT_THAT(
        problemsOf(log + "type = 'accounting'\nentry.indented = true\n"),
        ElementsAre("zrm.toml:4: log.entry: has no meaning for type \"accounting\"; leave it "
                    "out"));
}

TEST(LogReader, UnwrapsWhatContainersWrite) {
    const auto log = logsOf("[[log]]\npath = '/a'\nunwrap = 'cri'\nentry.indented = true\n")[0];
    ASSERT_TRUE(log.follow.format);
    ASSERT_TRUE(log.follow.join);
    EXPECT_TRUE(log.follow.join->joins("t stdout F a", "t stdout F  b"));
    EXPECT_TRUE(log.follow.join->joins("t stdout P a", "t stdout F b"));
    EXPECT_FALSE(log.follow.join->joins("t stdout F a", "t stdout F b"));
    EXPECT_THAT(problemsOf("[[log]]\npath = '/a'\nunwrap = 'podman'\n"),
                ElementsAre("zrm.toml:3: log.unwrap: 'podman' is not a container runtime's "
                            "format; write \"docker\" or \"cri\""));
}

TEST(LogReader, ReadsEverythingThatATableMaySay) {
    const std::vector<LogConfig> logs = logsOf(R"(
[[log]]
path        = ["/srv/a.log", "/srv/*/app-?[0-9].log"]
exclude     = ["*.gz", "/srv/old/*"]
type        = "text"
format      = 'A,"%d-%d-%d %255[^\n]" , year month day description'
follow      = "file"
resume      = false
start       = "beginning"
rotate_wait = "5s"
rotated_to  = "old"
debug       = true
timezone    = "Europe/Berlin"

[[log]]
path = "/var/log/account"
type = "accounting"
)");
    ASSERT_EQ(logs.size(), 2U);
    const LogConfig& log = logs[0];
    EXPECT_THAT(log.paths, ElementsAre("/srv/a.log", "/srv/*/app-?[0-9].log"));
    EXPECT_THAT(log.excludes, ElementsAre("*.gz", "/srv/old/*"));
    EXPECT_EQ(log.letter, 'U');
    EXPECT_EQ(log.format, "A,\"%d-%d-%d %255[^\\n]\" , year month day description");
    EXPECT_TRUE(log.debug);
    EXPECT_EQ(log.follow.follow, FollowSettings::Follow::file);
    EXPECT_EQ(log.follow.start, FollowSettings::Start::beginning);
    EXPECT_FALSE(log.follow.resume);
    EXPECT_EQ(log.follow.rotateWait, std::chrono::seconds(5));
    EXPECT_EQ(log.follow.rotatedTo, "old");
    EXPECT_EQ(log.follow.timezone, "Europe/Berlin");
    EXPECT_GT(log.follow.zone.size(), 50U);
    EXPECT_EQ(logs[1].type, "accounting");
    EXPECT_EQ(logs[1].letter, 'A');
}

TEST(LogReader, WithoutAHistoryNothingIsResumed) {
    const std::vector<LogConfig> logs =
        logsOf("[history]\nenabled = false\n[[log]]\npath = '/var/log/syslog'\n");
    ASSERT_EQ(logs.size(), 1U);
    EXPECT_FALSE(logs[0].follow.resume);
    EXPECT_THAT(problemsOf("[history]\nenabled = false\n[[log]]\npath = '/a'\nresume = true\n"),
                ElementsAre("zrm.toml:5: log.resume: needs the history, which stores how far each "
                            "log was read; write enabled = true in [history], or resume = false"));
}

TEST(LogReader, SaysWhatIsWrongWithAPath) {
    EXPECT_THAT(problemsOf("[[log]]\n"),
                ElementsAre("zrm.toml:1: log.path: is missing; write path = \"/var/log/syslog\", "
                            "or a list of paths and globs"));
    EXPECT_THAT(problemsOf("[[log]]\npath = []\n"),
                ElementsAre("zrm.toml:2: log.path: names no file; write path = "
                            "\"/var/log/syslog\", or a list of paths and globs"));
    EXPECT_THAT(
        problemsOf("[[log]]\npath = [\n'relative',\n'/var/log/',\n'/var/**/x.log'\n]\n"),
        ElementsAre("zrm.toml:3: log.path: 'relative' is not an absolute path; begin it with '/'",
                    "zrm.toml:4: log.path: '/var/log/' names a directory; name the files in it, "
                    "for example \"/var/log/*.log\"",
                    "zrm.toml:5: log.path: '/var/**/x.log' holds '**', which does not search "
                    "directories of every depth; write one '*' for each level of directories"));
    EXPECT_THAT(problemsOf("[[log]]\npath = '/a'\n[[log]]\npath = ['/b', '/a']\n"),
                ElementsAre("zrm.toml:4: log.path: '/a' is named at line 2 already; name it once"));
    EXPECT_THAT(problemsOf("[[log]]\npath = '/" + std::string(5000, 'a') + "'\n"),
                ElementsAre("zrm.toml:2: log.path: the path has 5001 bytes; write at most 4095"));
    EXPECT_THAT(problemsOf("[[log]]\npath = 1\n"),
                ElementsAre("zrm.toml:2: log.path: is a whole number; write a list of texts in "
                            "quotes"));
    EXPECT_EQ(problemsOf("[[log]]\npath = [\n1\n]\nexclude = ['a', true]\n").size(), 2U);
}

TEST(LogReader, RefusesABracketThatIsNotClosed) {
    const std::string cure =
        "; close it with ']' in the same name, or write '\\[' for the character itself";
    EXPECT_THAT(problemsOf("[[log]]\npath = ['/var/log/[x', '/a/[b/c]']\nexclude = ['[!]*']\n"),
                ElementsAre("zrm.toml:2: log.path: '/var/log/[x' has a '[' without its ']'" + cure,
                            "zrm.toml:2: log.path: '/a/[b/c]' has a '[' without its ']'" + cure,
                            "zrm.toml:3: log.exclude: '[!]*' has a '[' without its ']'" + cure));
    for (const char* const closed :
         {"/a[0-9]", "/a]", "/[]]", "/[!]a]", "/\\[x", "/[\\]]", "/[[:digit:]x]", "/[a]/[b]"}) {
        EXPECT_THAT(problemsOf(std::string("[[log]]\npath = '") + closed + "'\n"), IsEmpty())
            << closed;
    }
    for (const char* const open : {"/[]", "/[^]", "/[\\]", "/[[:digit:]", "/[[:digit"}) {
        EXPECT_EQ(problemsOf(std::string("[[log]]\npath = '") + open + "'\n").size(), 1U) << open;
    }
}

TEST(LogReader, RefusesWhatTheAgentWritesItself) {
    const std::string sink = "[[sink]]\ntype = 'jsonl'\npath = '/var/log/zrm/events.log'\n";
    EXPECT_THAT(problemsOf(sink + "[[log]]\npath = '/var/log/zrm/events.log'\n"),
                ElementsAre("zrm.toml:5: log.path: '/var/log/zrm/events.log' is the output of a "
                            "sink: the agent writes this file, and each event "
                            "would raise the next; leave it out"));
    EXPECT_THAT(
        problemsOf(sink + "[[log]]\npath = '/var/log/*/*.log'\n"),
        ElementsAre("zrm.toml:5: log.path: '/var/log/*/*.log' matches /var/log/zrm/events.log, the "
                    "output of a sink: the agent writes this file, and each "
                    "event would raise the next; exclude the file, or name the logs more "
                    "narrowly"));
    EXPECT_THAT(problemsOf(sink + "[[log]]\npath = '/var/log/*/*.log'\nexclude = 'events.*'\n"),
                IsEmpty());
    EXPECT_EQ(problemsOf("[[log]]\npath = '/var/lib/zrm/*'\n").size(), 1U);
    EXPECT_EQ(problemsOf("[agent]\ndebug_log = '/d.log'\n[[log]]\npath = '/d.log'\n").size(), 1U);
}

TEST(LogReader, SaysWhatIsWrongWithTheRest) {
    EXPECT_THAT(
        problemsOf(R"([[log]]
path = '/a'
type = "sylog"
follow = "inode"
start = "now"
rotate_wait = "2 s"
timezone = "Nowhere/Town"
exclude = "sub/x"
colour = 1
rotated_to = ""
)"),
        ElementsAre(
            HasSubstr("zrm.toml:3: log.type: 'sylog' is not a choice here; write \"syslog\", "
                      "\"text\", \"accounting\", \"errorlog\""),
            "zrm.toml:4: log.follow: 'inode' is not a choice here; write \"name\" "
            "or \"file\"",
            "zrm.toml:5: log.start: 'now' is not a choice here; write \"end\" or "
            "\"beginning\"",
            "zrm.toml:6: log.rotate_wait: '2 s' is not a duration from a second to "
            "an hour; write for example \"2s\" or \"5m\"",
            "zrm.toml:7: log.timezone: 'Nowhere/Town' is not a time zone of this "
            "machine; write \"UTC\" or a name like \"Europe/Berlin\" (timedatectl "
            "list-timezones lists them)",
            "zrm.toml:8: log.exclude: 'sub/x' is neither a path nor a file name; "
            "begin a path with '/', or write a file name without any '/'",
            HasSubstr(
                "zrm.toml:9: log.colour: unknown key; the keys here are type, exclude, path, "),
            "zrm.toml:10: log.rotated_to: is not a directory; write the directory "
            "to which rotation moves older files, for example \"/var/log/old\""));
}

TEST(LogReader, RefusesKeysThatHaveNoMeaningForAType) {
    EXPECT_THAT(problemsOf("[[log]]\npath = '/a'\nformat = '%s'\n"),
                ElementsAre(HasSubstr("zrm.toml:3: log.format: '%s' is not the name of a ready "
                                      "format")));
    EXPECT_THAT(problemsOf("[[log]]\npath = '/a'\ntype = 'accounting'\ntimezone = 'UTC'\n"),
                ElementsAre("zrm.toml:4: log.timezone: has no meaning for type \"accounting\"; "
                            "leave it out"));
    EXPECT_THAT(problemsOf("[[log]]\npath = '/a'\ntype = 'errorlog'\nformat = 'errpt -a'\n"),
                ElementsAre("zrm.toml:3: log.type: an error log is read only on AIX; write another "
                            "type"));
}

TEST(LogReader, ChecksTheFormatOfATextLog) {
    EXPECT_EQ(problemsOf("[[log]]\npath = '/a'\ntype = 'text'\n").size(), 1U);
    const std::vector<std::string> problems =
        problemsOf("[[log]]\npath = '/a'\ntype = 'text'\nformat = '\"%d\" , nonsense'\n");
    ASSERT_EQ(problems.size(), 1U);
    EXPECT_TRUE(problems[0].starts_with("zrm.toml:4: log.format: cannot be used")) << problems[0];
    EXPECT_EQ(problemsOf("[[log]]\npath = '/a'\ntype = 'text'\nformat = '" +
                         std::string(2000, 'a') + "'\n")
                  .size(),
              1U);
    const std::string named = "A,\"%s ${@}${@}${@}\" , year";
    const std::string path = '/' + std::string(400, 'p');
    const std::vector<std::string> tooLong =
        problemsOf("[[log]]\npath = '" + path + "'\ntype = 'text'\nformat = '" + named + "'\n");
    ASSERT_EQ(tooLong.size(), 1U);
    EXPECT_TRUE(tooLong[0].starts_with(
        "zrm.toml:4: log.format: has 1217 characters once each ${@} is replaced by '/ppp"))
        << tooLong[0];
    const std::vector<std::string> tooWide =
        problemsOf("[[log]]\npath = '" + path +
                   "'\ntype = 'text'\nformat = 'A,\"%s\" , description = \"${@} %s\"'\n");
    ASSERT_EQ(tooWide.size(), 1U);
    EXPECT_TRUE(tooWide[0].starts_with("zrm.toml:4: log.format: has a directive of more than 255 "
                                       "characters once each ${@} is replaced by '/ppp"))
        << tooWide[0];
    EXPECT_TRUE(tooWide[0].ends_with("give the log a shorter path")) << tooWide[0];
}

TEST(LogReader, ReadsWhenALogIsQuiet) {
    const auto quiet = [](const std::string& text) {
        return logsOf("[[log]]\npath = '/a'\nquiet = '" + text + "'\n")[0].follow.quiet;
    };
    EXPECT_FALSE(logsOf("[[log]]\npath = '/a'\n")[0].follow.quiet);
    EXPECT_TRUE(quiet("learn").isLearned);
    EXPECT_EQ(quiet("30m"), (QuietRule{false, std::chrono::minutes(30)}));
    for (const char* const text : {"9s", "367d", "soon", "", "0s"}) {
        EXPECT_THAT(problemsOf("[[log]]\npath = '/a'\nquiet = '" + std::string(text) + "'\n"),
                    ElementsAre("zrm.toml:3: log.quiet: '" + std::string(text) +
                                "' is neither learn nor a duration from 10 s to a year; write "
                                "\"learn\", or for example \"30m\" or \"2h\""));
    }
}

} // namespace
