#include "host/sinks/SyslogMessage.h"

#include "SinkTest.h"
#include "host/config/SinkTypes.h"

#include <gtest/gtest.h>

#include <string>

#include <unistd.h>

using namespace zrm::host;

namespace {

std::string messageOf(const EntryEvents::Entry& entry, std::string_view facility = "daemon") {
    EntryEvents events;
    events.add(entry);
    return SyslogMessage(facility).text(events.records().front());
}

std::string processId() {
    return std::to_string(getpid());
}

/// The message of the first event with this priority, structured data and text.
std::string expected(int priority, const std::string& data, const std::string& text) {
    return "<" + std::to_string(priority) + ">1 2026-11-20T07:03:09.412Z web1 zrmagent " +
           processId() + " event [zrm@32473 id=\"1\"" + data + "] " + text;
}

constexpr const char* usualData =
    R"( situation="ssh-bruteforce" severity="critical" log="/var/log/auth.log")";

TEST(SyslogMessage, HasHeaderDataAndText) {
    EXPECT_EQ(messageOf({}), expected(26, usualData, "Failed password for root"));
}

TEST(SyslogMessage, OfAnEpisodeHasItsStateIdAndCount) {
    EntryEvents events;
    events.addWithoutRow(EntryEvents::episode("resolved") +
                         R"(,"reason":"the situation was removed")" + EntryEvents::withoutRow);
    const std::string message = SyslogMessage("daemon").text(events.records().front());
    EXPECT_NE(message.find(" web1 zrmagent "), std::string::npos) << message;
    EXPECT_NE(message.find(R"( state="resolved" episode="1" count="74"] )"
                           "resolved: the situation was removed; 74 entries from "),
              std::string::npos)
        << message;
}

TEST(SyslogMessage, FieldsAreASecondElement) {
    const std::string message =
        messageOf({.more = R"(,"fields":{"user":"root","a b=":"x]\"y"},"entry":"the line")"});
    EXPECT_TRUE(message.ends_with(R"(] Failed password for root)")) << message;
    EXPECT_NE(message.find(R"(][zrm-fields@32473 user="root" a_b_="x\]\"y"] )"), message.npos)
        << message;
}

TEST(SyslogMessage, FieldsTakeAtMostHalfOfTheMessage) {
    const std::string fields =
        R"(,"fields":{"long":")" + std::string(5000, 'x') + R"(","user":"root"})";
    const std::string message = messageOf({.more = fields});
    EXPECT_NE(message.find(R"([zrm-fields@32473 user="root"] Failed)"), message.npos) << message;
}

TEST(SyslogMessage, TheEntryTakesThePlaceOfADescriptionThatIsCut) {
    const std::string message =
        messageOf({.more = R"(,"entry":"the whole line")", .column = std::string(256, 'x')});
    EXPECT_TRUE(message.ends_with("] the whole line")) << message;
}

TEST(SyslogMessage, TheTextMadeForTheEventIsTheMessage) {
    const std::string message =
        messageOf({.more = R"(,"text":"5 logins","runbook":"https://wiki/","labels":{"a":"b"})"});
    EXPECT_TRUE(message.ends_with(R"(log="/var/log/auth.log"] 5 logins)")) << message;
}

TEST(SyslogMessage, ThePriorityCombinesFacilityAndSeverity) {
    const auto priority = [](std::string_view facility, const std::string& severity) {
        const std::string message = messageOf({.severity = severity}, facility);
        return message.substr(0, message.find('>') + 1);
    };
    EXPECT_EQ(priority("kern", "critical"), "<2>");
    EXPECT_EQ(priority("user", "info"), "<14>");
    EXPECT_EQ(priority("daemon", "minor"), "<29>");
    EXPECT_EQ(priority("daemon", "warning"), "<28>");
    EXPECT_EQ(priority("auth", "major"), "<35>");
    EXPECT_EQ(priority("authpriv", "info"), "<86>");
    EXPECT_EQ(priority("local0", "info"), "<134>");
    EXPECT_EQ(priority("local7", "info"), "<190>");
    EXPECT_EQ(syslogFacilities.size(), 24u);
}

TEST(SyslogMessage, EscapesCharactersThatWouldEndAValue) {
    EXPECT_EQ(messageOf({.situation = R"(a\"b]c\\d)", .log = R"(/var/[x]"\y)"}),
              expected(26,
                       R"( situation="a\\\"b\]c\\\\d" severity="critical" log="/var/[x\]\"\\y")",
                       "Failed password for root"));
}

TEST(SyslogMessage, TextThatIsNotAsciiBeginsWithAByteOrderMark) {
    EXPECT_EQ(messageOf({.description = "caf\xc3\xa9", .log = "/var/log/\xc3\xa4"}),
              expected(26,
                       " situation=\"ssh-bruteforce\" severity=\"critical\" "
                       "log=\"/var/log/\xc3\xa4\"",
                       "\xef\xbb\xbf"
                       "caf\xc3\xa9"));
}

TEST(SyslogMessage, HasNoControlCharacters) {
    EXPECT_EQ(messageOf({.description = R"(a\tb\nc\u0000d\u007fe)", .log = "/var/\x01\n"}),
              expected(26, " situation=\"ssh-bruteforce\" severity=\"critical\" log=\"/var/  \"",
                       "a b c d e"));
}

TEST(SyslogMessage, CharactersThatControlHowTextIsShownAreEscaped) {
    EXPECT_EQ(messageOf({.description = "a\xc2\x9b"
                                        "31m\xe2\x80\xae"
                                        "b",
                         .log = "/\xe2\x81\xa7"}),
              expected(26, " situation=\"ssh-bruteforce\" severity=\"critical\" log=\"/\\\\u2067\"",
                       "\xef\xbb\xbf"
                       "a\\u009b31m\\u202eb"));
}

TEST(SyslogMessage, IsCutAtTheEndOfACharacter) {
    const std::size_t front = messageOf({.description = "x"}).size() - 1;
    const std::size_t room = SyslogMessage::longest - front;
    const std::string whole(room, 'x');
    EXPECT_EQ(messageOf({.description = whole}), expected(26, usualData, whole));
    EXPECT_EQ(messageOf({.description = whole + "y"}), expected(26, usualData, whole));
    // The mark takes three bytes; the last character has two, of which only one fits.
    const std::string cut(room - 4, 'x');
    EXPECT_EQ(messageOf({.description = cut + "\xc3\xa9"}),
              expected(26, usualData, "\xef\xbb\xbf" + cut));
    EXPECT_EQ(messageOf({.description = cut.substr(1) + "\xc3\xa9"}),
              expected(26, usualData, "\xef\xbb\xbf" + cut.substr(1) + "\xc3\xa9"));
}

TEST(SyslogMessage, TheDataIsNeverCut) {
    const std::string log = "/" + std::string(3000, ']');
    std::string escaped = "/";
    for (int count = 0; count < 3000; ++count) {
        escaped += "\\]";
    }
    EXPECT_EQ(
        messageOf({.log = log}),
        expected(26, " situation=\"ssh-bruteforce\" severity=\"critical\" log=\"" + escaped + "\"",
                 ""));
}

TEST(SyslogMessage, AnUnknownHostIsADashAndAnOddOneHasQuestionMarks) {
    const auto host = [](const std::string& node) {
        const std::string json = R"({"row":{"ORIGINNODE":")" + node + R"("}})";
        const std::string message =
            SyslogMessage("daemon").text({1, EntryEvents::raisedAt, "a", "info", "/a", json});
        const std::size_t begin = message.find("Z ") + 2;
        return message.substr(begin, message.find(" zrmagent") - begin);
    };
    EXPECT_EQ(host(""), "-");
    EXPECT_EQ(host(":ZRM"), "-");
    EXPECT_EQ(host("web 1\xc3\xa9:ZRM"), "web?1??");
    EXPECT_EQ(host(std::string(300, 'a') + ":ZRM"), std::string(255, 'a'));
}

} // namespace
