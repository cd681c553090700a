#include "host/config/ConfigFile.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <variant>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

std::vector<LogConfig> accepted(const std::string& text) {
    const ConfigFile::Result result = ConfigFile::parse(text, "zrm.toml");
    if (!result) {
        ADD_FAILURE() << result.error().front();
        return {};
    }
    return result->logs;
}

std::vector<std::string> refused(const std::string& text) {
    const ConfigFile::Result result = ConfigFile::parse(text, "zrm.toml");
    return result ? std::vector<std::string>{} : result.error();
}

TEST(LogReader, APathAloneIsASyslogFileFollowedByName) {
    const std::vector<LogConfig> logs = accepted("\n[[log]]\npath = '/var/log/syslog'\n");
    ASSERT_EQ(logs.size(), 1U);
    LogConfig expected;
    expected.paths = {"/var/log/syslog"};
    expected.line = 2;
    EXPECT_EQ(logs[0], expected);
    EXPECT_TRUE(logs[0].follow.resume);
    EXPECT_EQ(logs[0].follow.rotateWait, std::chrono::seconds(2));
}

TEST(LogReader, ReadsAJournal) {
    const LogConfig everything = accepted("[[log]]\ntype = 'journal'\n")[0];
    EXPECT_EQ(everything.name, "journal");
    EXPECT_EQ(everything.letter, 'J');
    EXPECT_EQ(everything.journal, JournalConfig());
    EXPECT_THAT(everything.paths, IsEmpty());
    const LogConfig some = accepted("[[log]]\ntype = 'journal'\nname = 'web'\n"
                                    "units = ['ssh', 'nginx*', 'a.socket']\n"
                                    "identifiers = 'sudo'\npriority = 'warning'\n"
                                    "boot = 'current'\ndirectory = '/j'\nstart = 'beginning'\n"
                                    "keep = ['_PID']\n")[0];
    EXPECT_EQ(some.name, "web");
    ASSERT_TRUE(some.journal);
    EXPECT_THAT(some.journal->units, ElementsAre("ssh.service", "nginx*", "a.socket"));
    EXPECT_THAT(some.journal->identifiers, ElementsAre("sudo"));
    EXPECT_EQ(some.journal->priority, 4);
    EXPECT_TRUE(some.journal->isCurrentBoot);
    EXPECT_EQ(some.journal->directory, "/j");
}

TEST(LogReader, ReadsACommand) {
    const LogConfig list =
        accepted("[[log]]\ntype = 'command'\ncommand = ['/bin/dmesg', '-w']\nrestart = '5s'\n")[0];
    EXPECT_EQ(list.name, "dmesg");
    EXPECT_EQ(list.letter, 'C');
    ASSERT_TRUE(list.command);
    EXPECT_THAT(list.command->arguments, ElementsAre("/bin/dmesg", "-w"));
    EXPECT_EQ(list.command->pause, std::chrono::seconds(5));
    EXPECT_TRUE(list.command->restarts);
    const LogConfig shell = accepted("[[log]]\ntype = 'command'\n"
                                     "command = 'my.sh a | grep b'\nrestart = 'never'\n")[0];
    EXPECT_EQ(shell.name, "my-sh");
    EXPECT_THAT(shell.command->arguments, ElementsAre("/bin/sh", "-c", "my.sh a | grep b"));
    EXPECT_FALSE(shell.command->restarts);
}

TEST(LogReader, RefusesWhatAJournalCannotBe) {
    EXPECT_THAT(
        refused("[[log]]\ntype = 'journal'\npath = '/a'\nunits = []\npriority = 'loud'\n"
                "boot = 'last'\ndirectory = 'x'\nname = 'a/b'\nrotate_wait = '1s'\n"),
        testing::IsSupersetOf(
            {"zrm.toml:3: log.path: has no meaning for type \"journal\"; leave it out",
             "zrm.toml:4: log.units: has 0 items; write 1 to 1000, or leave it out",
             "zrm.toml:5: log.priority: 'loud' is not a priority; write emerg, alert, crit, err, "
             "warning, notice, info or debug",
             "zrm.toml:6: log.boot: 'last' is not a choice here; write \"all\" or \"current\"",
             "zrm.toml:7: log.directory: 'x' is not an absolute path; begin it with '/', or leave "
             "it out for the journal of this machine",
             "zrm.toml:8: log.name: 'a/b' is not the name of a log; write 1 to 64 letters, digits "
             "and characters of -_@:",
             "zrm.toml:9: log.rotate_wait: has no meaning for type \"journal\"; leave it out"}));
    EXPECT_THAT(refused("[[log]]\ntype = 'journal'\n[[log]]\ntype = 'journal'\n"),
                ElementsAre("zrm.toml:3: log.name: the [[log]] at line 1 is named 'journal' "
                            "already; give this one another, for example name = \"journal-2\""));
}

TEST(LogReader, ReadsWhatIsReadFromTheMessagesOfAJournal) {
    EXPECT_FALSE(accepted("[[log]]\ntype = 'journal'\n")[0].messages);
    const LogConfig extracts = accepted("[[log]]\ntype = 'journal'\n[[log.extract]]\n"
                                        "source = 'sshd'\npatterns = ['for (?P<user>a)']\n")[0];
    ASSERT_TRUE(extracts.messages);
    EXPECT_THAT(extracts.messages->definition(), HasSubstr("for (?P<user>a)"));
    const std::string formats = "[formats]\ndirectory = '" ZRM_FORMATS "'\n";
    const LogConfig named =
        accepted(formats + "[[log]]\ntype = 'journal'\nformat = ['sshd', 'sudo']\n")[0];
    ASSERT_TRUE(named.messages);
    EXPECT_THAT(named.messages->definition(), HasSubstr("authentication failure"));
    EXPECT_EQ(named.type, "journal");
    const LogConfig lines = accepted(formats + "[[log]]\ntype = 'journal'\nformat = 'json'\n"
                                               "columns = { type = 'lvl' }\n")[0];
    EXPECT_THAT(lines.messages->definition(), HasSubstr("lvl"));
}

TEST(LogReader, RefusesWhatMessagesOfAJournalCannotBe) {
    const std::string log = "[[log]]\ntype = 'journal'\n";
    EXPECT_THAT(
        refused(log + "entry = { starts = 'a' }\nunwrap = 'cri'\ntime_format = 'auto'\n"),
        ElementsAre("zrm.toml:3: log.entry: has no meaning for a journal, in which each message is "
                    "an entry, also one of several lines; leave it out; what a program writes line "
                    "by line is an entry per line",
                    "zrm.toml:4: log.unwrap: has no meaning for a journal, whose messages are not "
                    "wrapped; leave it out",
                    "zrm.toml:5: log.time_format: has no meaning for a journal, which has each "
                    "message's time; leave it out"));
    EXPECT_THAT(
        refused(log + "columns = { type = 'a' }\n"),
        ElementsAre("zrm.toml:3: log.columns: has no meaning for type \"journal\"; leave it "
                    "out"));
    EXPECT_THAT(refused(log + "format = '(?P<a>b)'\n"),
                ElementsAre(HasSubstr("zrm.toml:3: log.format: '(?P<a>b)' is not the name of a "
                                      "ready format; ")));
    EXPECT_THAT(refused("[formats]\ndirectory = '" ZRM_FORMATS "'\n" + log + "format = 'docker'\n"),
                ElementsAre("zrm.toml:5: log.format: is not a format of a program's messages; name "
                            "the format in which the program writes its lines"));
}

TEST(LogReader, ReadsHowTheOutputOfACommandIsTakenApart) {
    const std::string log = "[formats]\ndirectory = '" ZRM_FORMATS "'\n"
                            "[[log]]\ntype = 'command'\ncommand = 'a'\n";
    const LogConfig plain = accepted(log + "entry = { indented = true }\n")[0];
    EXPECT_FALSE(plain.follow.format);
    EXPECT_TRUE(plain.follow.join);
    const LogConfig named = accepted(log + "format = 'json'\ncolumns = { time = 'at' }\n")[0];
    ASSERT_TRUE(named.follow.format);
    EXPECT_THAT(named.follow.format->definition(), HasSubstr("\"at\""));
    EXPECT_EQ(named.type, "command");
    const LogConfig joined = accepted(log + "format = 'java'\n")[0];
    EXPECT_TRUE(joined.follow.format && joined.follow.join) << "the format says which lines";
    const LogConfig own = accepted(log + "format = '(?P<description>.*)'\n"
                                         "entry = { continues = '^ ' }\n")[0];
    EXPECT_TRUE(own.follow.format && own.follow.join);
    EXPECT_TRUE(accepted(log + "[[log.extract]]\npatterns = ['(?P<a>b)']\n")[0].follow.format);
    EXPECT_THAT(refused(log + "format = 'jsonn'\ncolumns = { time = 'at' }\n"),
                ElementsAre(HasSubstr("zrm.toml:6: log.format: there is no format 'jsonn'")));
    EXPECT_THAT(refused(log + "entry = { }\n"),
                ElementsAre(HasSubstr("log.entry: does not say which lines make an entry")));
}

TEST(LogReader, RefusesToUnwrapTheFormatLanguage) {
    EXPECT_THAT(
        refused("[[log]]\npath = '/a'\ntype = 'text'\nformat = 'A,\"%255[^\\n]\" , "
                "description'\nunwrap = 'cri'\n"),
        ElementsAre("zrm.toml:5: log.unwrap: has no meaning for type \"text\"; describe what "
                    "the program writes by an expression: type = \"regex\""));
}

TEST(LogReader, RefusesWhatACommandCannotBe) {
    EXPECT_THAT(refused("[[log]]\ntype = 'command'\n"),
                ElementsAre("zrm.toml:1: log.command: is missing, and type \"command\" needs it; "
                            "write the program and its arguments, for example [\"dmesg\", "
                            "\"-w\"], or one text for the shell"));
    EXPECT_THAT(refused("[[log]]\ntype = 'command'\ncommand = 'a'\nresume = true\n"
                        "restart = '2m'\nkeep = ['x']\n"),
                ElementsAre("zrm.toml:4: log.resume: has no meaning for type \"command\": what a "
                            "command has printed cannot be read again; leave it out",
                            "zrm.toml:5: log.restart: '2m' is not a duration from a second to a "
                            "minute; write for example \"1s\", or \"never\"",
                            "zrm.toml:6: log.keep: has no meaning for type \"command\"; leave it "
                            "out"));
}

TEST(LogReader, ASituationNamesALogThatIsNotAFile) {
    EXPECT_THAT(refused("[[log]]\ntype = 'journal'\n[[situation]]\nname = 'a'\n"
                        "log = 'journal'\n"),
                IsEmpty());
    EXPECT_THAT(
        refused("[[situation]]\nname = 'a'\nlog = 'syslog'\n"),
        ElementsAre("zrm.toml:3: situation.log: 'syslog' is not the absolute path of a file, "
                    "and no log has this name; begin a path with '/', or name a [[log]] "
                    "that is not a file, such as \"journal\""));
}

TEST(LogReader, ReadsWhatEventsKeepOfTheirEntries) {
    const EntryKeep usual = accepted("[[log]]\npath = '/a'\n")[0].follow.keep;
    EXPECT_EQ(usual.fields, std::nullopt);
    EXPECT_EQ(usual.textBytes, 65536U);
    const EntryKeep keep =
        accepted("[[log]]\npath = '/a'\nkeep = ['user', '*']\nentry_bytes = 0\n")[0].follow.keep;
    EXPECT_EQ(keep.fields, (std::vector<std::string>{"user", "*"}));
    EXPECT_EQ(keep.textBytes, 0U);
    EXPECT_EQ(accepted("[[log]]\npath = '/a'\nkeep = []\n")[0].follow.keep.fields,
              std::vector<std::string>{});
}

TEST(LogReader, RefusesWhatEventsCannotKeep) {
    EXPECT_THAT(refused("[[log]]\npath = '/a'\nkeep = ['', 'field.user']\nentry_bytes = 65537\n"),
                ElementsAre("zrm.toml:3: log.keep: '' is not the name of a field; write 1 to 255 "
                            "bytes",
                            "zrm.toml:3: log.keep: 'field.user' begins with 'field.'; write 'user'",
                            "zrm.toml:4: log.entry_bytes: 65537 is out of bounds; write a number "
                            "from 0 to 65536"));
    EXPECT_EQ(
        refused("[[log]]\npath = '/a'\ntype = 'accounting'\nkeep = 'a'\nentry_bytes = 1\n").size(),
        2U);
    EXPECT_EQ(refused("[[log]]\npath = '/a'\ntype = 'text'\nkeep = 'a'\nformat = "
                      "'A,\"%d %255[^\\n]\" , year description'\n")
                  .size(),
              1U);
}

TEST(LogReader, ReadsWhichLinesMakeAnEntry) {
    EXPECT_FALSE(accepted("[[log]]\npath = '/a'\n")[0].follow.join);
    const auto log = accepted("[[log]]\npath = '/a'\nentry = { starts = '^\\d', lines = 9, bytes = "
                              "99, wait = '3s' }\n")[0];
    ASSERT_TRUE(log.follow.join);
    EXPECT_EQ(log.letter, 'S') << "the columns are those of a syslog file";
    EXPECT_TRUE(log.follow.join->joins("1", "a"));
    EXPECT_FALSE(log.follow.join->joins("a", "1"));
    EXPECT_EQ(log.follow.join->limits().lines, 9U);
    EXPECT_EQ(log.follow.join->limits().bytes, 99U);
    EXPECT_EQ(log.follow.join->limits().wait, std::chrono::seconds(3));
    const auto text =
        accepted("[[log]]\npath = '/a'\ntype = 'text'\nentry.indented = true\nformat = "
                 "'A,\"%d %255[^\\n]\" , year description'\n")[0];
    ASSERT_TRUE(text.follow.join);
    EXPECT_TRUE(text.follow.join->joins("a", " b"));
}

TEST(LogReader, RefusesLinesThatMakeNoEntry) {
    const std::string log = "[[log]]\npath = '/a'\n";
    EXPECT_THAT(
        refused(log + "entry = { starts = '(' }\n"),
        ElementsAre("zrm.toml:3: log.entry.starts: '(' is not a regular expression: missing "
                    "): (; see github.com/google/re2/wiki/Syntax"));
    EXPECT_THAT(refused(log + "entry = { lines = 5 }\n"),
                ElementsAre("zrm.toml:3: log.entry: does not say which lines make an entry; write "
                            "starts, continues or indented = true, for example { starts = "
                            "'^\\d{4}-' }"));
    EXPECT_THAT(
        refused(log +
                "[log.entry]\nindented = true\nlines = 1\nbytes = 65537\nwait = '2m'\nend = 1\n"),
        ElementsAre("zrm.toml:5: log.entry.lines: 1 is not between 2 and 10000; write a number in "
                    "that range",
                    "zrm.toml:6: log.entry.bytes: 65537 is not between 2 and 65536; write a number "
                    "in that range",
                    "zrm.toml:7: log.entry.wait: '2m' is not a duration from a second to a minute; "
                    "write for example \"2s\"",
                    HasSubstr("zrm.toml:8: log.entry.end: ")));
    EXPECT_THAT(refused(log + "entry = { starts = 'a', continues = 'b' }\n"),
                ElementsAre("zrm.toml:3: log.entry: says in more than one way which lines make an "
                            "entry; keep one of starts, continues and indented"));
    EXPECT_THAT(refused(log + "entry = { starts = '' }\n"),
                ElementsAre("zrm.toml:3: log.entry.starts: is empty; write a regular expression"));
    EXPECT_THAT(
        refused(log + "type = 'accounting'\nentry.indented = true\n"),
        ElementsAre("zrm.toml:4: log.entry: has no meaning for type \"accounting\"; leave it "
                    "out"));
}

TEST(LogReader, UnwrapsWhatContainersWrite) {
    const auto log = accepted("[[log]]\npath = '/a'\nunwrap = 'cri'\nentry.indented = true\n")[0];
    ASSERT_TRUE(log.follow.format);
    ASSERT_TRUE(log.follow.join);
    EXPECT_TRUE(log.follow.join->joins("t stdout F a", "t stdout F  b"));
    EXPECT_TRUE(log.follow.join->joins("t stdout P a", "t stdout F b"));
    EXPECT_FALSE(log.follow.join->joins("t stdout F a", "t stdout F b"));
    EXPECT_THAT(refused("[[log]]\npath = '/a'\nunwrap = 'podman'\n"),
                ElementsAre("zrm.toml:3: log.unwrap: 'podman' is not a container runtime's "
                            "format; write \"docker\" or \"cri\""));
}

TEST(LogReader, ReadsEverythingThatATableMaySay) {
    const std::vector<LogConfig> logs = accepted(R"(
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
        accepted("[history]\nenabled = false\n[[log]]\npath = '/var/log/syslog'\n");
    ASSERT_EQ(logs.size(), 1U);
    EXPECT_FALSE(logs[0].follow.resume);
    EXPECT_THAT(refused("[history]\nenabled = false\n[[log]]\npath = '/a'\nresume = true\n"),
                ElementsAre("zrm.toml:5: log.resume: needs the history, which stores how far each "
                            "log was read; write enabled = true in [history], or resume = false"));
}

TEST(LogReader, SaysWhatIsWrongWithAPath) {
    EXPECT_THAT(refused("[[log]]\n"),
                ElementsAre("zrm.toml:1: log.path: is missing; write path = \"/var/log/syslog\", "
                            "or a list of paths and globs"));
    EXPECT_THAT(refused("[[log]]\npath = []\n"),
                ElementsAre("zrm.toml:2: log.path: names no file; write path = "
                            "\"/var/log/syslog\", or a list of paths and globs"));
    EXPECT_THAT(
        refused("[[log]]\npath = [\n'relative',\n'/var/log/',\n'/var/**/x.log'\n]\n"),
        ElementsAre("zrm.toml:3: log.path: 'relative' is not an absolute path; begin it with '/'",
                    "zrm.toml:4: log.path: '/var/log/' names a directory; name the files in it, "
                    "for example \"/var/log/*.log\"",
                    "zrm.toml:5: log.path: '/var/**/x.log' holds '**', which does not search "
                    "directories of every depth; write one '*' for each level of directories"));
    EXPECT_THAT(refused("[[log]]\npath = '/a'\n[[log]]\npath = ['/b', '/a']\n"),
                ElementsAre("zrm.toml:4: log.path: '/a' is named at line 2 already; name it once"));
    EXPECT_THAT(refused("[[log]]\npath = '/" + std::string(5000, 'a') + "'\n"),
                ElementsAre("zrm.toml:2: log.path: the path has 5001 bytes; write at most 4095"));
    EXPECT_THAT(refused("[[log]]\npath = 1\n"),
                ElementsAre("zrm.toml:2: log.path: is a whole number; write a list of texts in "
                            "quotes"));
    EXPECT_EQ(refused("[[log]]\npath = [\n1\n]\nexclude = ['a', true]\n").size(), 2U);
}

TEST(LogReader, RefusesABracketThatIsNotClosed) {
    const std::string cure =
        "; close it with ']' in the same name, or write '\\[' for the character itself";
    EXPECT_THAT(refused("[[log]]\npath = ['/var/log/[x', '/a/[b/c]']\nexclude = ['[!]*']\n"),
                ElementsAre("zrm.toml:2: log.path: '/var/log/[x' has a '[' without its ']'" + cure,
                            "zrm.toml:2: log.path: '/a/[b/c]' has a '[' without its ']'" + cure,
                            "zrm.toml:3: log.exclude: '[!]*' has a '[' without its ']'" + cure));
    for (const char* const closed :
         {"/a[0-9]", "/a]", "/[]]", "/[!]a]", "/\\[x", "/[\\]]", "/[[:digit:]x]", "/[a]/[b]"}) {
        EXPECT_THAT(refused(std::string("[[log]]\npath = '") + closed + "'\n"), IsEmpty())
            << closed;
    }
    for (const char* const open : {"/[]", "/[^]", "/[\\]", "/[[:digit:]", "/[[:digit"}) {
        EXPECT_EQ(refused(std::string("[[log]]\npath = '") + open + "'\n").size(), 1U) << open;
    }
}

TEST(LogReader, RefusesWhatTheAgentWritesItself) {
    const std::string sink = "[[sink]]\ntype = 'jsonl'\npath = '/var/log/zrm/events.log'\n";
    EXPECT_THAT(refused(sink + "[[log]]\npath = '/var/log/zrm/events.log'\n"),
                ElementsAre("zrm.toml:5: log.path: '/var/log/zrm/events.log' is the output of a "
                            "sink: the agent writes this file, and each event "
                            "would raise the next; leave it out"));
    EXPECT_THAT(
        refused(sink + "[[log]]\npath = '/var/log/*/*.log'\n"),
        ElementsAre("zrm.toml:5: log.path: '/var/log/*/*.log' matches /var/log/zrm/events.log, the "
                    "output of a sink: the agent writes this file, and each "
                    "event would raise the next; exclude the file, or name the logs more "
                    "narrowly"));
    EXPECT_THAT(refused(sink + "[[log]]\npath = '/var/log/*/*.log'\nexclude = 'events.*'\n"),
                IsEmpty());
    EXPECT_EQ(refused("[[log]]\npath = '/var/lib/zrm/*'\n").size(), 1U);
    EXPECT_EQ(refused("[agent]\ndebug_log = '/d.log'\n[[log]]\npath = '/d.log'\n").size(), 1U);
}

TEST(LogReader, SaysWhatIsWrongWithTheRest) {
    EXPECT_THAT(
        refused(R"([[log]]
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
    EXPECT_THAT(refused("[[log]]\npath = '/a'\nformat = '%s'\n"),
                ElementsAre(HasSubstr("zrm.toml:3: log.format: '%s' is not the name of a ready "
                                      "format")));
    EXPECT_THAT(refused("[[log]]\npath = '/a'\ntype = 'accounting'\ntimezone = 'UTC'\n"),
                ElementsAre("zrm.toml:4: log.timezone: has no meaning for type \"accounting\"; "
                            "leave it out"));
    EXPECT_THAT(refused("[[log]]\npath = '/a'\ntype = 'errorlog'\nformat = 'errpt -a'\n"),
                ElementsAre("zrm.toml:3: log.type: an error log is read only on AIX; write another "
                            "type"));
}

TEST(LogReader, ChecksTheFormatOfATextLog) {
    EXPECT_EQ(refused("[[log]]\npath = '/a'\ntype = 'text'\n").size(), 1U);
    const std::vector<std::string> problems =
        refused("[[log]]\npath = '/a'\ntype = 'text'\nformat = '\"%d\" , nonsense'\n");
    ASSERT_EQ(problems.size(), 1U);
    EXPECT_TRUE(problems[0].starts_with("zrm.toml:4: log.format: cannot be used")) << problems[0];
    EXPECT_EQ(
        refused("[[log]]\npath = '/a'\ntype = 'text'\nformat = '" + std::string(2000, 'a') + "'\n")
            .size(),
        1U);
    const std::string named = "A,\"%s ${@}${@}${@}\" , year";
    const std::string path = '/' + std::string(400, 'p');
    const std::vector<std::string> tooLong =
        refused("[[log]]\npath = '" + path + "'\ntype = 'text'\nformat = '" + named + "'\n");
    ASSERT_EQ(tooLong.size(), 1U);
    EXPECT_TRUE(tooLong[0].starts_with(
        "zrm.toml:4: log.format: has 1217 characters once each ${@} is replaced by '/ppp"))
        << tooLong[0];
}

} // namespace
