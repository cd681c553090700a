#include "logtypes/SyslogFields.h"

#include "base/EntryFields.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <random>
#include <string>
#include <string_view>

using namespace zrm;
using namespace std::string_literals;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using testing::UnorderedElementsAre;

using Fields = std::map<std::string, std::string>;

Fields read(std::string_view line) {
    EntryFields fields;
    SyslogFields::read(line, fields);
    Fields result;
    for (const EntryFields::Field& field : fields.all()) {
        result.emplace(field.name, field.value);
    }
    return result;
}

/// The fields of the structured data alone.
Fields data(const std::string& text) {
    Fields fields = read("<34>1 2026-10-05T07:03:09Z h a p m " + text);
    for (const char* const name : {"host", "tag", "app", "pid", "procid", "msgid", "message",
                                   "facility", "facility_code", "severity", "severity_code"}) {
        fields.erase(name);
    }
    return fields;
}

TEST(SyslogFields, OfTheTraditionalForm) {
    EXPECT_THAT(read("Oct  5 07:03:09 web1 sshd[412]: Failed password for root"),
                UnorderedElementsAre(Pair("host", "web1"), Pair("tag", "sshd"), Pair("pid", "412"),
                                     Pair("message", "Failed password for root")));
}

TEST(SyslogFields, OfTheIsoForm) {
    EXPECT_THAT(
        read("2026-10-05T07:03:09.123456+02:00 web1 kernel: oops"),
        UnorderedElementsAre(Pair("host", "web1"), Pair("tag", "kernel"), Pair("message", "oops")));
}

TEST(SyslogFields, OfRfc5424) {
    EXPECT_THAT(read("<165>1 2026-10-05T07:03:09Z web1 app 8710 ID47 "
                     "[origin@32473 ip=\"192.0.2.1\" port=\"22\"] text"),
                UnorderedElementsAre(Pair("host", "web1"), Pair("tag", "app"), Pair("app", "app"),
                                     Pair("pid", "8710"), Pair("procid", "8710"),
                                     Pair("msgid", "ID47"), Pair("message", "text"),
                                     Pair("facility", "local4"), Pair("facility_code", "20"),
                                     Pair("severity", "notice"), Pair("severity_code", "5"),
                                     Pair("origin@32473.ip", "192.0.2.1"),
                                     Pair("origin@32473.port", "22")));
    EXPECT_THAT(read("<0>1 - - - - - -"),
                UnorderedElementsAre(Pair("facility", "kern"), Pair("facility_code", "0"),
                                     Pair("severity", "emerg"), Pair("severity_code", "0")));
}

TEST(SyslogFields, ALongHostAndTagAreWhole) {
    const std::string host = "ip-10-0-0-17.eu-central-1.compute.internal-" + std::string(20, 'x');
    const std::string tag = "systemd-networkd-wait-online" + std::string(300, '-');
    ASSERT_EQ(host.size(), 63u);
    const Fields fields = read("Oct  5 07:03:09 " + host + " " + tag + "[12345]: text");
    EXPECT_EQ(fields.at("host"), host);
    EXPECT_EQ(fields.at("tag"), tag);
    EXPECT_EQ(fields.at("pid"), "12345");
}

TEST(SyslogFields, PrioritiesOfEveryForm) {
    EXPECT_EQ(read("<191>Oct  5 07:03:09 web1 app: text").at("facility"), "local7");
    EXPECT_EQ(read("<191>Oct  5 07:03:09 web1 app: text").at("severity"), "debug");
    EXPECT_EQ(read("<9>Oct  5 07:03:09 web1 app: text").at("facility_code"), "1");
    EXPECT_EQ(read("<99>Oct  5 07:03:09 web1 app: text").at("facility_code"), "12");
    EXPECT_FALSE(read("<192>Oct  5 07:03:09 web1 app: text").contains("severity"));
    EXPECT_FALSE(read("Oct  5 07:03:09 web1 app: text").contains("severity"));
}

TEST(SyslogFields, TagsWithAndWithoutAProcess) {
    EXPECT_EQ(read("Oct  5 07:03:09 h postfix/smtpd[7]: x").at("tag"), "postfix/smtpd");
    EXPECT_EQ(read("Oct  5 07:03:09 h odd[7: x").at("tag"), "odd[7");
    EXPECT_EQ(read("Oct  5 07:03:09 h a[b][7]: x").at("tag"), "a[b]");
    EXPECT_FALSE(read("Oct  5 07:03:09 h [7]: x").contains("tag"));
    EXPECT_FALSE(read("Oct  5 07:03:09 h app[]: x").contains("pid"));
}

TEST(SyslogFields, LinesThatAreNotRecognisedAreAllMessage) {
    EXPECT_THAT(read("anything else"), ElementsAre(Pair("message", "anything else")));
    EXPECT_THAT(read(""), IsEmpty());
}

TEST(SyslogFields, StructuredDataOfSeveralElements) {
    EXPECT_THAT(data("[a x=\"1\"][b x=\"2\" y=\"\"]"),
                UnorderedElementsAre(Pair("a.x", "1"), Pair("b.x", "2"), Pair("b.y", "")));
    EXPECT_THAT(data("[a][b x=\"2\"]"), ElementsAre(Pair("b.x", "2")));
    EXPECT_THAT(data("[a x=\"1\" x=\"2\"]"), ElementsAre(Pair("a.x", "1")));
    EXPECT_THAT(data("-"), IsEmpty());
}

TEST(SyslogFields, EscapesInStructuredDataAreResolved) {
    EXPECT_THAT(data(R"([a q="say \"hi\"" b="c:\\d" e="[x\]" o="\n\\"])"),
                UnorderedElementsAre(Pair("a.q", "say \"hi\""), Pair("a.b", "c:\\d"),
                                     Pair("a.e", "[x]"), Pair("a.o", "\\n\\")));
}

TEST(SyslogFields, DamagedStructuredDataEndsWhereItIsDamaged) {
    EXPECT_THAT(data("[a x=\"1\" y]"), ElementsAre(Pair("a.x", "1")));
    EXPECT_THAT(data("[a x=\"1\" y=2]"), ElementsAre(Pair("a.x", "1")));
    EXPECT_THAT(data("[a x=\"1\" y=\"2"), ElementsAre(Pair("a.x", "1")));
    EXPECT_THAT(data("[a x=\"1\\"), IsEmpty());
    EXPECT_THAT(data("[a x=\"1\" "), ElementsAre(Pair("a.x", "1")));
    EXPECT_THAT(data("["), IsEmpty());
}

TEST(SyslogFields, OddBytesStayAsTheyAre) {
    EXPECT_THAT(data("[\xff x\x01=\"\xc3(\"]"), ElementsAre(Pair("\xff.x\x01", "\xc3(")));
    EXPECT_THAT(data("[a x=\"1\0002\"]"s), ElementsAre(Pair("a.x", "1\0002"s)));
}

TEST(SyslogFields, TenThousandParametersAreBounded) {
    std::string line = "<34>1 2026-10-05T07:03:09Z h a p m [s";
    for (int number = 0; number < 10'000; ++number) {
        line += " p" + std::to_string(number) + "=\"\\\"" + std::to_string(number) + "\"";
    }
    line += "] text";
    EntryFields fields;
    SyslogFields::read(line, fields);
    EXPECT_EQ(fields.all().size(), EntryFields::most);
    EXPECT_EQ(*fields.find("s.p7"), "\"7");
    EXPECT_EQ(*fields.find("message"), "text");
    EXPECT_EQ(fields.all().size() + fields.leftOut(), 11u + 10'000u);
}

TEST(SyslogFields, AnythingIsReadWithinTheLine) {
    std::mt19937 random(14);
    const std::string_view pieces[] = {
        "<34>1 ", "2026-10-05T07:03:09Z ", "[a", " x=\"", "\\", "\"", "]", " ", "-", "\xff", "y=",
        "["};
    EntryFields fields;
    for (int turn = 0; turn < 20'000; ++turn) {
        std::string line = "<34>1 2026-10-05T07:03:09Z h a p m ";
        for (int piece = 0; piece < 12; ++piece) {
            line += pieces[random() % std::size(pieces)];
        }
        const std::string exact(line); // a read beyond its end is one beyond the allocation
        fields.clear();
        SyslogFields::read(exact, fields);
        for (const EntryFields::Field& field : fields.all()) {
            ASSERT_LE(field.value.size(), exact.size()) << exact;
        }
    }
}

} // namespace
