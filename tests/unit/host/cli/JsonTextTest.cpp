#include "host/cli/JsonText.h"

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

using namespace zrm::host;

using Json = JsonText::Json;

TEST(JsonTextTest, MembersKeepTheirOrder) {
    EXPECT_EQ(JsonText::dump(Json::parse(R"({"b":1,"a":[2]})"), true), R"({"b":1,"a":[2]})");
    EXPECT_EQ(JsonText::dump(Json::parse(R"({"b":1,"a":[]})"), false),
              "{\n  \"b\": 1,\n  \"a\": []\n}");
}

TEST(JsonTextTest, ControlCharactersAreEscaped) {
    const std::string text = "\033\x7f\xC2\x9B\xC2\xA0é";
    const std::string dumped = JsonText::dump(text, true);
    EXPECT_EQ(dumped, "\"\\u001b\\u007f\\u009b\xC2\xA0é\"");
    EXPECT_EQ(Json::parse(dumped).get<std::string>(), text);
}

TEST(JsonTextTest, MembersAsTextAndNumber) {
    const Json object = Json::parse(R"({"a":"x","b":null,"c":17,"d":true,"e":[1]})");
    EXPECT_EQ(JsonText::text(object, "a"), "x");
    EXPECT_EQ(JsonText::text(object, "b"), "");
    EXPECT_EQ(JsonText::text(object, "c"), "17");
    EXPECT_EQ(JsonText::text(object, "d"), "true");
    EXPECT_EQ(JsonText::text(object, "e"), "[1]");
    EXPECT_EQ(JsonText::text(object, "missing"), "");
    EXPECT_EQ(JsonText::text(Json(3), "of no object"), "");
    EXPECT_EQ(JsonText::number(object, "c"), 17u);
    EXPECT_EQ(JsonText::number(object, "a"), 0u);
}
TEST(JsonTextTest, CharactersThatChangeTheDirectionOfTextAreEscaped) {
    EXPECT_EQ(JsonText::dump(JsonText::Json("a\xe2\x80\xae"
                                            "b"),
                             true),
              "\"a\\u202eb\"");
}
