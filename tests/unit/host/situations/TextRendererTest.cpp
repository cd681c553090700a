#include "host/situations/TextRenderer.h"

#include "host/base/Utf8.h"
#include "host/config/SituationValidator.h"
#include "support/RecordingTrace.h"
#include "support/TimeZone.h"
#include "unit/host/situations/GivenEntry.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::EndsWith;

class TextRendererTest : public testing::Test {
protected:
    static TextRenderer rendererOf(const std::string& text) {
        SituationText written;
        written.name = "ssh";
        written.text = text;
        written.when = {"ENTRYDESC matches '(?P<user>\\S+) from (?P<ip>\\S+)|logout'"};
        auto [situation, problems] = SituationValidator::check(written);
        EXPECT_TRUE(problems.empty()) << problems.front().text();
        return TextRenderer(situation);
    }
    std::string rendered(const std::string& text) {
        EntryReading reading;
        reading.begin(*entry.layout, entry.bytes(), &entry);
        return rendererOf(text).text(reading, facts);
    }

    RecordingTrace trace{0};
    const TimeZone zone{"UTC0"};
    GivenEntry entry;
    TextFacts facts{5, 1'795'158'189'000, 1'795'158'249'500, "/var/log/auth.log", {}, {}};
};

TEST_F(TextRendererTest, IsNotNeededWithoutPlaces) {
    EXPECT_FALSE(rendererOf("").isNeeded());
    EXPECT_FALSE(rendererOf("Repeated failures").isNeeded());
    EXPECT_TRUE(rendererOf("{count}").isNeeded());
}

TEST_F(TextRendererTest, PutsValuesInTheirPlaces) {
    entry.describe("Failed password for eve from 10.0.0.7");
    GivenEntry::fill(entry.row.entrysys, "web1");
    entry.given.add("pid", "412");
    EXPECT_EQ(rendered("{{{count}}} of {user} from {ip} on {ENTRYSYS}: {field.pid}"),
              "{5} of eve from 10.0.0.7 on web1: 412");
    EXPECT_EQ(rendered("{situation} {log} {first} {last}"),
              "ssh /var/log/auth.log 2026-11-20T07:03:09.000Z 2026-11-20T07:04:09.500Z");
}

TEST_F(TextRendererTest, LeavesAPlaceEmptyWhereTheEntryHasNothing) {
    entry.describe("logout");
    EXPECT_EQ(rendered("from {ip}, {field.none}, {ENTRYTYPE}."), "from , , .");
}

TEST_F(TextRendererTest, WritesTimeStampsAsTimes) {
    GivenEntry::fill(entry.row.entrytime, "1261120070309000");
    EXPECT_EQ(rendered("{ENTRYTIME}"), "2026-11-20T07:03:09.000Z");
    GivenEntry::fill(entry.row.entrytime, "");
    EXPECT_EQ(rendered("at {ENTRYTIME}"), "at ");
}

TEST_F(TextRendererTest, WritesOneLineOfUtf8) {
    entry.given.add("a", "one\r\ntwo\x1b[1m\x7f");
    entry.given.add("b", std::string_view("\xff\xc3\0z", 4));
    EXPECT_EQ(rendered("{field.a}|"), "one  two [1m |");
    const std::string broken = rendered("{field.b}");
    EXPECT_EQ(Utf8::validPrefix(broken), broken.size());
    EXPECT_THAT(broken, EndsWith("\xef\xbf\xbd z"));
}

TEST_F(TextRendererTest, CutsLongValuesAndLongTexts) {
    const std::string longest(64 * 1024, 'x');
    entry.given.add("long", longest);
    EXPECT_EQ(rendered("{field.long}|"), longest.substr(0, 1024) + "\xe2\x80\xa6|");
    std::string many;
    for (int time = 0; time < 10; ++time) {
        many += "{field.long}";
    }
    const std::string cut = rendered(many);
    EXPECT_EQ(cut.size(), 4096u + 3);
    EXPECT_THAT(cut, EndsWith("x\xe2\x80\xa6"));
}

TEST_F(TextRendererTest, WithoutAnEntryThereAreTheGroupsValues) {
    const std::vector<GroupValue> group = {{"ip", "10.0.0.7"}};
    facts.group = group;
    EXPECT_EQ(rendererOf("{count} from {ip} on {ENTRYSYS}").text(facts), "5 from 10.0.0.7 on -");
}

TEST_F(TextRendererTest, WithoutAnEntryThereAreTheValuesOfTheEntryThatRaisedTheEpisode) {
    entry.describe("Failed password for eve from 10.0.0.7");
    GivenEntry::fill(entry.row.entrysys, "web1");
    EntryReading reading;
    reading.begin(*entry.layout, entry.bytes(), &entry);
    const TextRenderer renderer = rendererOf("{count} of {user}, {user} on {ENTRYSYS} at {ip}");
    const std::vector<GroupValue> kept = renderer.values(reading);
    EXPECT_EQ(kept,
              (std::vector<GroupValue>{{"user", "eve"}, {"ENTRYSYS", "web1"}, {"ip", "10.0.0.7"}}));
    const std::vector<GroupValue> group = {{"ip", "10.0.0.8"}};
    facts.group = group;
    facts.values = kept;
    EXPECT_EQ(renderer.text(facts), "5 of eve, eve on web1 at 10.0.0.8") << "the group comes first";
}

} // namespace
