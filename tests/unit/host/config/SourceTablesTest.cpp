// [[log]] tables of logs that are not files.

#include "LogTables.h"

#include <gmock/gmock.h>

#include <chrono>
#include <string>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

TEST(SourceTables, ReadsAJournal) {
    const LogConfig everything = logsOf("[[log]]\ntype = 'journal'\n")[0];
    EXPECT_EQ(everything.name, "journal");
    EXPECT_EQ(everything.letter, 'J');
    EXPECT_EQ(everything.journal, JournalConfig());
    EXPECT_THAT(everything.paths, IsEmpty());
    const LogConfig some = logsOf("[[log]]\ntype = 'journal'\nname = 'web'\n"
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

TEST(SourceTables, ReadsACommand) {
    const LogConfig list =
        logsOf("[[log]]\ntype = 'command'\ncommand = ['/bin/dmesg', '-w']\nrestart = '5s'\n")[0];
    EXPECT_EQ(list.name, "dmesg");
    EXPECT_EQ(list.letter, 'C');
    ASSERT_TRUE(list.command);
    EXPECT_THAT(list.command->arguments, ElementsAre("/bin/dmesg", "-w"));
    EXPECT_EQ(list.command->pause, std::chrono::seconds(5));
    EXPECT_TRUE(list.command->restarts);
    const LogConfig shell = logsOf("[[log]]\ntype = 'command'\n"
                                   "command = 'my.sh a | grep b'\nrestart = 'never'\n")[0];
    EXPECT_EQ(shell.name, "my-sh");
    EXPECT_THAT(shell.command->arguments, ElementsAre("/bin/sh", "-c", "my.sh a | grep b"));
    EXPECT_FALSE(shell.command->restarts);
}

TEST(SourceTables, RefusesWhatAJournalCannotBe) {
    EXPECT_THAT(
        problemsOf("[[log]]\ntype = 'journal'\npath = '/a'\nunits = []\npriority = 'loud'\n"
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
    EXPECT_THAT(problemsOf("[[log]]\ntype = 'journal'\n[[log]]\ntype = 'journal'\n"),
                ElementsAre("zrm.toml:3: log.name: the [[log]] at line 1 is named 'journal' "
                            "already; give this one another, for example name = \"journal-2\""));
}

TEST(SourceTables, ReadsWhatIsReadFromTheMessagesOfAJournal) {
    EXPECT_FALSE(logsOf("[[log]]\ntype = 'journal'\n")[0].messages);
    const LogConfig extracts = logsOf("[[log]]\ntype = 'journal'\n[[log.extract]]\n"
                                      "source = 'sshd'\npatterns = ['for (?P<user>a)']\n")[0];
    ASSERT_TRUE(extracts.messages);
    EXPECT_THAT(extracts.messages->definition(), HasSubstr("for (?P<user>a)"));
    const std::string formats = "[formats]\ndirectory = '" ZRM_FORMATS "'\n";
    const LogConfig named =
        logsOf(formats + "[[log]]\ntype = 'journal'\nformat = ['sshd', 'sudo']\n")[0];
    ASSERT_TRUE(named.messages);
    EXPECT_THAT(named.messages->definition(), HasSubstr("authentication failure"));
    EXPECT_EQ(named.type, "journal");
    const LogConfig lines = logsOf(formats + "[[log]]\ntype = 'journal'\nformat = 'json'\n"
                                             "columns = { type = 'lvl' }\n")[0];
    EXPECT_THAT(lines.messages->definition(), HasSubstr("lvl"));
}

TEST(SourceTables, MessagesOfAJournalAreJoined) {
    const std::string table = "[[log]]\ntype = 'journal'\n";
    EXPECT_FALSE(logsOf(table)[0].follow.join);
    const LogConfig log = logsOf(table + "entry = { indented = true, wait = '5s' }\n")[0];
    ASSERT_TRUE(log.follow.join);
    EXPECT_TRUE(log.follow.join->joins("first", "  second"));
    EXPECT_EQ(log.follow.join->limits().wait, std::chrono::seconds(5));
    const std::string formats = "[formats]\ndirectory = '" ZRM_FORMATS "'\n" + table;
    EXPECT_TRUE(logsOf(formats + "format = 'java'\n")[0].follow.join);
    EXPECT_FALSE(logsOf(formats + "format = 'sshd'\n")[0].follow.join);
    EXPECT_THAT(problemsOf(table + "entry = { starts = '(' }\n"),
                ElementsAre(HasSubstr("log.entry.starts: ")));
    EXPECT_THAT(problemsOf(table + "entry = { wait = '2s' }\n"),
                ElementsAre(HasSubstr("does not say which lines make an entry")));
}

TEST(SourceTables, RefusesWhatMessagesOfAJournalCannotBe) {
    const std::string log = "[[log]]\ntype = 'journal'\n";
    EXPECT_THAT(
        problemsOf(log + "unwrap = 'cri'\ntime_format = 'auto'\n"),
        ElementsAre("zrm.toml:3: log.unwrap: has no meaning for a journal, whose messages are not "
                    "wrapped; leave it out",
                    "zrm.toml:4: log.time_format: has no meaning for a journal, which has each "
                    "message's time; leave it out"));
    EXPECT_THAT(
        problemsOf(log + "columns = { type = 'a' }\n"),
        ElementsAre("zrm.toml:3: log.columns: has no meaning for type \"journal\"; leave it "
                    "out"));
    EXPECT_THAT(problemsOf(log + "format = '(?P<a>b)'\n"),
                ElementsAre(HasSubstr("zrm.toml:3: log.format: '(?P<a>b)' is not the name of a "
                                      "ready format; ")));
    EXPECT_THAT(
        problemsOf("[formats]\ndirectory = '" ZRM_FORMATS "'\n" + log + "format = 'docker'\n"),
        ElementsAre("zrm.toml:5: log.format: is not a format of a program's messages; name "
                    "the format in which the program writes its lines"));
}

TEST(SourceTables, ReadsHowTheOutputOfACommandIsTakenApart) {
    const std::string log = "[formats]\ndirectory = '" ZRM_FORMATS "'\n"
                            "[[log]]\ntype = 'command'\ncommand = 'a'\n";
    const LogConfig plain = logsOf(log + "entry = { indented = true }\n")[0];
    EXPECT_FALSE(plain.follow.format);
    EXPECT_TRUE(plain.follow.join);
    const LogConfig named = logsOf(log + "format = 'json'\ncolumns = { time = 'at' }\n")[0];
    ASSERT_TRUE(named.follow.format);
    EXPECT_THAT(named.follow.format->definition(), HasSubstr("\"at\""));
    EXPECT_EQ(named.type, "command");
    const LogConfig joined = logsOf(log + "format = 'java'\n")[0];
    EXPECT_TRUE(joined.follow.format && joined.follow.join) << "the format says which lines";
    const LogConfig own = logsOf(log + "format = '(?P<description>.*)'\n"
                                       "entry = { continues = '^ ' }\n")[0];
    EXPECT_TRUE(own.follow.format && own.follow.join);
    EXPECT_TRUE(logsOf(log + "[[log.extract]]\npatterns = ['(?P<a>b)']\n")[0].follow.format);
    EXPECT_THAT(problemsOf(log + "format = 'jsonn'\ncolumns = { time = 'at' }\n"),
                ElementsAre(HasSubstr("zrm.toml:6: log.format: 'jsonn' is not a ready format")));
    EXPECT_THAT(problemsOf(log + "entry = { }\n"),
                ElementsAre(HasSubstr("log.entry: does not say which lines make an entry")));
}

TEST(SourceTables, RefusesWhatACommandCannotBe) {
    EXPECT_THAT(problemsOf("[[log]]\ntype = 'command'\n"),
                ElementsAre("zrm.toml:1: log.command: is missing, and type \"command\" needs it; "
                            "write the program and its arguments, for example [\"dmesg\", "
                            "\"-w\"], or one text for the shell"));
    EXPECT_THAT(problemsOf("[[log]]\ntype = 'command'\ncommand = 'a'\nresume = true\n"
                           "restart = '2m'\nkeep = ['x']\n"),
                ElementsAre("zrm.toml:4: log.resume: has no meaning for type \"command\": what a "
                            "command has printed cannot be read again; leave it out",
                            "zrm.toml:5: log.restart: '2m' is not a duration from a second to a "
                            "minute; write for example \"1s\", or \"never\"",
                            "zrm.toml:6: log.keep: has no meaning for type \"command\"; leave it "
                            "out"));
}

TEST(SourceTables, ASituationNamesALogThatIsNotAFile) {
    EXPECT_THAT(problemsOf("[[log]]\ntype = 'journal'\n[[situation]]\nname = 'a'\n"
                           "log = 'journal'\n"),
                IsEmpty());
    EXPECT_THAT(
        problemsOf("[[situation]]\nname = 'a'\nlog = 'syslog'\n"),
        ElementsAre("zrm.toml:3: situation.log: 'syslog' is not the absolute path of a file, "
                    "and no log has this name; begin a path with '/', or name a [[log]] "
                    "that is not a file, such as \"journal\""));
}

} // namespace
