#include "host/situations/EntryValue.h"

#include "support/AllocationCount.h"
#include "support/RecordingTrace.h"
#include "unit/host/situations/GivenEntry.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::HasSubstr;

class EntryValueTest : public testing::Test {
protected:
    std::string value(std::string_view name, const std::vector<std::string>& conditions = {}) {
        const std::vector<Condition> built = GivenEntry::conditions(conditions);
        EntryValues values(built);
        const Result<EntryValue> value = values.compile(name);
        if (!value) {
            return value.error().text();
        }
        EntryReading reading;
        reading.begin(*entry.layout, entry.bytes(), &entry);
        std::string room;
        return std::string(value->read(reading, room));
    }

    RecordingTrace trace{0};
    GivenEntry entry;
};

const std::string failed =
    "ENTRYDESC matches 'Failed password for (invalid user )?(?P<user>\\S+) from (?P<ip>\\S+)'";

TEST_F(EntryValueTest, IsAColumnInAnyCaseWithoutPadding) {
    GivenEntry::fill(entry.row.entrysys, "alpha");
    EXPECT_EQ(value("ENTRYSYS"), "alpha");
    EXPECT_EQ(value("entrySys"), "alpha");
    EXPECT_EQ(value("ENTRYSRC"), "");
    entry.row.freqthresh = -12;
    EXPECT_EQ(value("FREQTHRESH"), "-12");
}

TEST_F(EntryValueTest, IsAField) {
    entry.given.add("user", "root");
    EXPECT_EQ(value("field.user"), "root");
    EXPECT_EQ(value("field.other"), "");
    EXPECT_EQ(value("user", {"field.user = 'root'"}), "root");
}

TEST_F(EntryValueTest, HasNoFieldsWhereTheRowIsAll) {
    const std::vector<Condition> none;
    EntryValues values(none);
    EntryReading reading;
    reading.begin(*entry.layout, entry.bytes(), nullptr);
    std::string room;
    EXPECT_EQ(values.compile("field.user")->read(reading, room), "");
}

TEST_F(EntryValueTest, IsWhatAPatternHasCaptured) {
    entry.describe("Failed password for invalid user eve from 10.0.0.7 port 22");
    EXPECT_EQ(value("user", {failed}), "eve");
    EXPECT_EQ(value("ip", {failed}), "10.0.0.7");
    entry.given.add("request", "GET /admin HTTP/1.1");
    EXPECT_EQ(value("path", {"field.request matches '^GET (?P<path>\\S+)'"}), "/admin");
}

TEST_F(EntryValueTest, IsEmptyForACaptureThatTookNoPart) {
    entry.describe("logout of eve");
    const std::string either = "ENTRYDESC matches 'login of (?P<in>\\w+)|logout of (?P<out>\\w+)'";
    EXPECT_EQ(value("in", {either}), "");
    EXPECT_EQ(value("out", {either}), "eve");
    // Nor does the pattern match at all.
    EXPECT_EQ(value("ip", {failed}), "");
}

TEST_F(EntryValueTest, PrefersCapturesToColumnsAndThoseToFields) {
    entry.describe("system beta");
    GivenEntry::fill(entry.row.entrysys, "alpha");
    entry.given.add("entrysys", "gamma");
    const std::string onField = "field.entrysys = 'gamma'";
    EXPECT_EQ(value("entrysys", {onField}), "alpha");
    EXPECT_EQ(value("field.entrysys", {onField}), "gamma");
    EXPECT_EQ(value("entrysys", {onField, "ENTRYDESC matches 'system (?P<entrysys>\\w+)'"}),
              "beta");
    EXPECT_EQ(value("ENTRYDESC", {"ENTRYDESC matches 'system (?P<ENTRYDESC>\\w+)'"}), "beta");
}

TEST_F(EntryValueTest, IsTheFirstConditionsWhereSeveralCaptureTheName) {
    entry.describe("from 10.0.0.7 to 10.0.0.9");
    EXPECT_EQ(value("ip", {"ENTRYDESC matches 'to (?P<ip>\\S+)'",
                           "ENTRYDESC matches 'from (?P<ip>\\S+)'"}),
              "10.0.0.9");
}

TEST_F(EntryValueTest, RefusesUnknownNamesWithThoseThatAreKnown) {
    EXPECT_THAT(value("adress", {failed, "field.pid = 7"}),
                AllOf(HasSubstr("'adress' is not a name of this situation"),
                      HasSubstr("the names are user, ip, field.pid, ORIGINNODE, "),
                      HasSubstr("UENTRYDESC, and field.NAME")));
    EXPECT_THAT(value("user"), HasSubstr("captures with (?P<NAME>...)"));
    EXPECT_THAT(value(""), HasSubstr("'' is not a name"));
    EXPECT_THAT(value("field."), HasSubstr("does not name a field"));
    EXPECT_THAT(value("field." + std::string(256, 'x')), HasSubstr("1 to 255 bytes"));
}

TEST_F(EntryValueTest, GivesLongAndBrokenBytesAsTheyAre) {
    const std::string longest(64 * 1024, 'a');
    entry.given.add("long", longest);
    entry.given.add("broken", "a\xff\xfe\x01z");
    EXPECT_EQ(value("field.long"), longest);
    EXPECT_EQ(value("all", {"field.long matches '^(?P<all>a+)$'"}), longest);
    EXPECT_EQ(value("field.broken"), "a\xff\xfe\x01z");
    // A pattern of characters passes over what is none.
    EXPECT_EQ(value("last", {"field.broken matches '(?P<last>z)$'"}), "z");
}

TEST_F(EntryValueTest, MatchesAPatternOncePerEntry) {
    const std::vector<Condition> conditions = GivenEntry::conditions({failed});
    EntryValues values(conditions);
    const EntryValue user = values.compile("user").value();
    const EntryValue ip = values.compile("ip").value();
    EntryReading reading;
    std::string room;
    entry.describe("Failed password for bob from 10.0.0.7");
    reading.begin(*entry.layout, entry.bytes(), nullptr);
    EXPECT_EQ(user.read(reading, room), "bob");
    // What is matched once is not looked at again, even if the row no longer matches.
    entry.row.entrydesc[0] = 'f';
    EXPECT_EQ(ip.read(reading, room), "10.0.0.7");
    reading.begin(*entry.layout, entry.bytes(), nullptr);
    EXPECT_EQ(ip.read(reading, room), "");
}

TEST_F(EntryValueTest, AllocatesNothingPerEntryWithoutCaptures) {
    const std::vector<Condition> none;
    EntryValues values(none);
    const EntryValue description = values.compile("ENTRYDESC").value();
    const EntryValue user = values.compile("field.user").value();
    entry.given.add("user", "root");
    entry.describe("Failed password for bob from 10.0.0.7");
    EntryReading reading;
    std::string room;
    const long before = allocationCount();
    reading.begin(*entry.layout, entry.bytes(), &entry);
    EXPECT_EQ(description.read(reading, room).size() + user.read(reading, room).size(), 41u);
    EXPECT_EQ(allocationCount(), before);
}

} // namespace
