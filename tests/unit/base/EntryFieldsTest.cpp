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

TEST(EntryFields, AddsManyAsOneByOne) {
    const std::string longest(EntryFields::longestName, 'n');
    std::vector<EntryFields::Field> many = {
        {"first", "1"}, {"second", "2"}, {"first", "3"}, {longest, "4"}};
    std::vector<std::string> names;
    for (int number = 0; number < 300; ++number) {
        names.push_back("f" + std::to_string(number));
    }
    for (const std::string& name : names) {
        many.push_back({name, "x"});
    }
    EntryFields together;
    EntryFields single;
    together.add("second", "before");
    single.add("second", "before");
    together.add(many);
    for (const auto& [name, value] : many) {
        single.add(name, value);
    }
    ASSERT_EQ(together.all().size(), single.all().size());
    for (std::size_t i = 0; i < single.all().size(); ++i) {
        EXPECT_EQ(together.all()[i].name, single.all()[i].name);
        EXPECT_EQ(together.all()[i].value, single.all()[i].value);
    }
    EXPECT_EQ(together.leftOut(), single.leftOut());
    EXPECT_EQ(*together.find("first"), "1");
    EXPECT_EQ(*together.find("second"), "before");
    EXPECT_EQ(*together.find(longest), "4");
    EXPECT_NE(together.find("f250"), nullptr);
    EXPECT_EQ(together.find("f251"), nullptr) << "repeated ones count among the most";
    EXPECT_EQ(together.leftOut(), 49u);
    EXPECT_EQ(together.all().size(), EntryFields::most - 2);
}

TEST(EntryFields, KeepsTheFirstOfARepeatedNameWhateverIsAskedFirst) {
    EntryFields fields;
    const std::vector<EntryFields::Field> pairs = {{"ab", "1"}, {"cb", "2"}, {"ab", "3"}};
    fields.add(pairs);
    EXPECT_EQ(*fields.find("ab"), "1");
    ASSERT_EQ(fields.all().size(), 2u);
    fields.add("cb", "4");
    fields.add("d", "5");
    EXPECT_EQ(*fields.find("cb"), "2");
    ASSERT_EQ(fields.all().size(), 3u);
    EXPECT_EQ(fields.all()[1].value, "2");
    EXPECT_EQ(fields.all()[2].name, "d");
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
