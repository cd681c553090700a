#include "base/EntryFields.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm;

namespace {

TEST(EntryFields, FindsValuesByName) {
    EntryFields fields;
    fields.add("host", "web1");
    fields.add("empty", "");
    ASSERT_NE(fields.find("host"), nullptr);
    EXPECT_EQ(*fields.find("host"), "web1");
    ASSERT_NE(fields.find("empty"), nullptr);
    EXPECT_EQ(*fields.find("empty"), "");
    EXPECT_EQ(fields.find("hos"), nullptr);
    EXPECT_EQ(fields.find("Host"), nullptr);
    fields.clear();
    EXPECT_EQ(fields.find("host"), nullptr);
}

TEST(EntryFields, OfSeveralFieldsOfOneNameTheFirstCounts) {
    EntryFields fields;
    fields.add("user", "alice");
    fields.add("user", "bob");
    EXPECT_EQ(*fields.find("user"), "alice");
    EXPECT_EQ(fields.all().size(), 1u);
    EXPECT_EQ(fields.leftOut(), 0u);
}

TEST(EntryFields, LeavesOutWhatIsBeyondItsBounds) {
    EntryFields fields;
    fields.add("", "no name");
    fields.add(std::string(EntryFields::longestName + 1, 'n'), "too long a name");
    EXPECT_EQ(fields.leftOut(), 2u);
    std::vector<std::string> names;
    for (int number = 0; number < 10'000; ++number) {
        names.push_back("f" + std::to_string(number));
    }
    for (const std::string& name : names) {
        fields.add(name, "x");
    }
    EXPECT_EQ(fields.all().size(), EntryFields::most);
    EXPECT_NE(fields.find("f255"), nullptr);
    EXPECT_EQ(fields.find("f256"), nullptr);
    EXPECT_EQ(fields.leftOut(), 2u + 10'000u - EntryFields::most);
}

TEST(EntryFields, BuildsTextsInItsOwnMemory) {
    EntryFields fields;
    const auto first = fields.append("a").append(".").append("b").takeText();
    const auto second = fields.append("second").takeText();
    EXPECT_EQ(first, "a.b");
    EXPECT_EQ(second, "second");
    EXPECT_EQ(fields.takeText(), "");
}

TEST(EntryFields, ATextForWhichThereIsNoRoomLeavesTheOthersAlone) {
    EntryFields fields;
    const std::string most(EntryFields::room - 4, 'x');
    const auto first = fields.append(most).takeText();
    EXPECT_EQ(first, most);
    EXPECT_EQ(fields.append("ab").append("cdef").append("g").takeText(), std::nullopt);
    EXPECT_EQ(fields.append("abcd").takeText(), "abcd");
    EXPECT_EQ(fields.append("e").takeText(), std::nullopt);
    EXPECT_EQ(first, most);
    fields.clear();
    EXPECT_EQ(fields.append("e").takeText(), "e");
}

} // namespace
