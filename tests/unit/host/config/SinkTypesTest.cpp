#include "host/config/SinkTypes.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <set>
#include <string>

using namespace zrm::host;

namespace {

TEST(SinkTypes, TheKeyTypeNamesEveryType) {
    std::vector<std::string_view> names;
    for (const SinkType& type : SinkTypes::all()) {
        names.push_back(type.name);
    }
    const SinkOption& key = SinkTypes::common().front();
    EXPECT_EQ(key.name, "type");
    EXPECT_THAT(key.choices, testing::ElementsAreArray(names));
}

TEST(SinkTypes, FindsTypesByName) {
    for (const SinkType& type : SinkTypes::all()) {
        EXPECT_EQ(SinkTypes::find(type.name), &type);
    }
    EXPECT_EQ(SinkTypes::find("kafka"), nullptr);
}

TEST(SinkTypes, TheTargetIsARequiredOptionAndNoOptionOccursTwice) {
    for (const SinkType& type : SinkTypes::all()) {
        std::set<std::string_view> names;
        for (const SinkOption& option : SinkTypes::common()) {
            names.insert(option.name);
        }
        for (const SinkOption& option : type.options) {
            EXPECT_TRUE(names.insert(option.name).second) << option.name;
        }
        const auto target =
            std::find_if(type.options.begin(), type.options.end(),
                         [&](const SinkOption& option) { return option.name == type.target; });
        ASSERT_NE(target, type.options.end()) << type.name;
        EXPECT_EQ(target->need, SinkOption::REQUIRED) << type.name;
    }
}

} // namespace
