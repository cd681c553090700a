#include "host/sources/FoundLogs.h"

#include "host/base/JsonWriter.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

std::string jsonOf(const FoundLogs::Source& source) {
    return JsonWriter::text([&](JsonWriter& json) { source.write(json); });
}

TEST(FoundLogs, KeepsTheFirstFilesThatArePassedOver) {
    FoundLogs::Source source;
    for (std::size_t i = 0; i < FoundLogs::mostPassedOver + 5; ++i) {
        source.passOver("/a" + std::to_string(i), "It is a directory");
    }
    EXPECT_EQ(source.passedOver.size(), FoundLogs::mostPassedOver);
    EXPECT_EQ(source.passedOverCount, FoundLogs::mostPassedOver + 5);
    EXPECT_TRUE(source.mentions("/a0"));
    EXPECT_FALSE(source.mentions("/b"));
}

TEST(FoundLogs, YieldsTheFilesOfTheLogConfiguration) {
    FoundLogs found;
    found.sources.push_back({1, "syslog", {"/*.log"}, {"/a.log", "/b.log"}, {}, 0, ""});
    const std::vector<FoundLogs::Source> beside = found.sourcesBeside({"/a.log", "/c.log"});
    ASSERT_EQ(beside.size(), 1U);
    EXPECT_THAT(beside[0].files, ElementsAre("/b.log"));
    ASSERT_EQ(beside[0].passedOver.size(), 1U);
    EXPECT_EQ(beside[0].passedOver[0].file, "/a.log");
    EXPECT_EQ(found.sources[0].files.size(), 2U);
    EXPECT_THAT(found.sourcesBeside({})[0].passedOver, IsEmpty());
}

TEST(FoundLogs, WritesATable) {
    FoundLogs::Source source{3, "json", {"/*.log"}, {"/a.log"}, {}, 0, "More match"};
    source.passOver("/\xff.log", "Its name is not UTF-8");
    EXPECT_EQ(
        jsonOf(source),
        R"({"line":3,"format":"json","path":["/*.log"],"files":["/a.log"],"passed_over":[{"file":")"
        "/\xef\xbf\xbd.log"
        R"(","reason":"Its name is not UTF-8."}],"passed_over_count":1,)"
        R"("problem":"More match."})");
    EXPECT_TRUE(jsonOf({}).ends_with(R"("problem":null})"));
}

} // namespace
