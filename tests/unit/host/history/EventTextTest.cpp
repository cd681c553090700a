#include "host/history/EventText.h"

#include "host/base/JsonWriter.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <iostream>
#include <random>
#include <string>

using namespace zrm::host;

namespace {

std::string documentOf(const std::string& description) {
    return R"({"id":17,"situation":"Disk Full","severity":"major","row":{)"
           R"("ORIGINNODE":"web1:ZRM","ENTRYTIME":"1261120070309000",)"
           R"("ENTRYSRC":"sshd[412]","FREQTHRESH":5,"UENTRYDESC":)" +
           JsonWriter::text([&](JsonWriter& json) { json.value(description); }) + "}}";
}

bool isFound(const std::string& text, const std::string& description = "") {
    return EventText(text).isIn("/var/log/auth.log", documentOf(description));
}

TEST(EventText, IsFoundInThePartsThatPeopleSearch) {
    EXPECT_TRUE(isFound("disk full"));
    EXPECT_TRUE(isFound("SSHD[4"));
    EXPECT_TRUE(isFound("/log/AUTH"));
    EXPECT_TRUE(isFound("root", "Failed password for Root"));
    EXPECT_TRUE(isFound(""));
    EXPECT_FALSE(isFound("roots", "Failed password for Root"));
}

TEST(EventText, IsFoundInTheEntryAndItsFields) {
    const std::string document = R"({"id":1,"situation":"s","row":{},)"
                                 R"("fields":{"user":"Alice"},"entry":"The whole LINE"})";
    EXPECT_TRUE(EventText("whole line").isIn("/log", document));
    EXPECT_TRUE(EventText("alice").isIn("/log", document));
    EXPECT_TRUE(
        EventText("10.0.0.1")
            .isIn("/log", R"({"id":1,"situation":"s","log":"/log","group":{"ip":"10.0.0.1"}})"));
    EXPECT_FALSE(EventText("user").isIn("/log", document));
    EXPECT_FALSE(EventText("bob").isIn("/log", document));
}

TEST(EventText, IsFoundInTheTextAndTheLabels) {
    const std::string document = R"({"id":1,"situation":"s","text":"5 failed LOGINS",)"
                                 R"("runbook":"https://wiki/","labels":{"team":"Web"},"row":{}})";
    EXPECT_TRUE(EventText("failed logins").isIn("/log", document));
    EXPECT_TRUE(EventText("web").isIn("/log", document));
    EXPECT_FALSE(EventText("wiki").isIn("/log", document));
}

TEST(EventText, IsNotFoundInNamesNumbersTimesAndTheNode) {
    for (const char* const text :
         {"UENTRYDESC", "row", "web1", "1261120", "17", "major", "\":\""}) {
        EXPECT_FALSE(isFound(text)) << text;
    }
}

TEST(EventText, CharactersThatJsonEscapesAreFound) {
    EXPECT_TRUE(isFound("say \"NO\"", "They say \"no\"."));
    EXPECT_TRUE(isFound("\"", "\""));
    EXPECT_TRUE(isFound("c:\\temp", "in C:\\Temp\\x"));
    EXPECT_TRUE(isFound("a\tb", "a\tb"));
    EXPECT_TRUE(isFound("M\xc3\xbcll", "Herr M\xc3\xbcller"));
    EXPECT_TRUE(isFound("x\xe2\x80\xaey", "x\xe2\x80\xaey"));
    EXPECT_FALSE(isFound("\\u", "a\x01b"));
}

TEST(EventText, SearchesTheRawBytesOfInvalidJson) {
    EXPECT_TRUE(EventText("abc").isIn("", "{rubbish ABC"));
    EXPECT_FALSE(EventText("abc").isIn("", "{rubbish"));
}

TEST(EventText, AgreesWithAPlainSearch) {
    const auto seed = std::random_device{}();
    std::cout << "seed " << seed << std::endl;
    std::mt19937 random(seed);
    const auto textOf = [&](std::size_t most) {
        std::string text(std::uniform_int_distribution<std::size_t>(0, most)(random), ' ');
        std::generate(text.begin(), text.end(), [&] { return "abAB"[random() % 4]; });
        return text;
    };
    const auto lower = [](std::string text) {
        for (char& c : text) {
            c = c == 'A' ? 'a' : c == 'B' ? 'b' : c;
        }
        return text;
    };
    for (int number = 0; number < 20'000; ++number) {
        const std::string text = textOf(6);
        const std::string log = textOf(40);
        EXPECT_EQ(EventText(text).isIn(log, "{}"),
                  lower(log).find(lower(text)) != std::string::npos)
            << text << " in " << log;
    }
    const std::string longText = textOf(0) + std::string(300, 'a') + "b";
    EXPECT_TRUE(EventText(longText).isIn(std::string(700, 'A') + "B", "{}"));
}

} // namespace
