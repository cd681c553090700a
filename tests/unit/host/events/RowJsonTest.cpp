#include "host/events/RowJson.h"

#include "host/base/SteeringText.h"

#include "host/base/Utf8.h"
#include "unit/host/framework/TestTable.h"

#include <gtest/gtest.h>

#include <limits>
#include <random>

#include <nlohmann/json.hpp>

using namespace zrm::host;

namespace {

std::string jsonText(std::string_view text) {
    std::string out = "before ";
    RowJson::appendText(out, text);
    EXPECT_TRUE(out.starts_with("before "));
    return out.substr(7);
}

TEST(RowJson, WritesTheColumnsInTableOrder) {
    TestManager manager;
    TestReceiver receiver;
    ContextInfo context{receiver};
    RequestDetail detail;
    TestRequest request(&detail, &context, &manager);
    const RowLayout layout(request);
    std::string out = "[";
    RowJson::append(out, layout, TestRow("/var/log/", "messages", "say \"hi\"", -42).bytes());
    out += ',';
    RowJson::append(out, layout,
                    TestRow("", "twelve_bytes", "é\t", std::numeric_limits<int>::min()).bytes());
    EXPECT_EQ(out,
              R"([{"LOGPATH":"/var/log/","LOGNAME":"messages","TEXT":"say \"hi\"","NUMBER":-42},)"
              R"({"LOGPATH":"","LOGNAME":"twelve_bytes","TEXT":"é\t","NUMBER":-2147483648})");
}

TEST(RowJson, ARowWithoutColumnsIsAnEmptyObject) {
    class Empty : public TestRequest {
    public:
        using TestRequest::TestRequest;
        int NumColumns() override { return 0; }
    };
    TestManager manager;
    TestReceiver receiver;
    ContextInfo context{receiver};
    RequestDetail detail;
    Empty request(&detail, &context, &manager);
    std::string out;
    RowJson::append(out, RowLayout(request), "");
    EXPECT_EQ(out, "{}");
}

TEST(RowJson, EscapesCharactersThatJsonDoesNotAllow) {
    EXPECT_EQ(jsonText(""), R"("")");
    EXPECT_EQ(jsonText("plain / text ~\x7f"), "\"plain / text ~\x7f\"");
    EXPECT_EQ(jsonText("\"\\\b\f\n\r\t"), R"("\"\\\b\f\n\r\t")");
    EXPECT_EQ(jsonText(std::string_view("\0\x01\x1f", 3)), R"("\u0000\u0001\u001f")");
    EXPECT_EQ(jsonText("Grüße € \U0001F600"), "\"Grüße € \U0001F600\"");
    EXPECT_EQ(jsonText("a\xFF\xE2\x82z"), "\"a\uFFFD\uFFFDz\"");
}

// Each byte at each of the eight positions that are examined together.
TEST(RowJson, EscapesAtEveryPosition) {
    for (int byte = 0; byte < 128; ++byte) {
        for (std::size_t place = 0; place < 20; ++place) {
            std::string text(20, 'x');
            text[place] = static_cast<char>(byte);
            ASSERT_EQ(jsonText(text), nlohmann::json(text).dump()) << byte << " at " << place;
        }
    }
}

TEST(RowJson, AgreesWithTheJsonLibraryOnRandomBytes) {
    std::mt19937 random(20261120);
    for (int round = 0; round < 20000; ++round) {
        std::string text(random() % 40, ' ');
        for (char& c : text) {
            const unsigned kind = random() % 8;
            c = static_cast<char>(kind == 0   ? random() % 256
                                  : kind == 1 ? random() % 32
                                              : 'a' + kind);
        }
        const auto replace = nlohmann::json::error_handler_t::replace;
        const std::string written = jsonText(text);
        const auto parsed = nlohmann::json::parse(written);
        ASSERT_EQ(Utf8::validPrefix(written), written.size());
        if (Utf8::validPrefix(text) == text.size()) {
            ASSERT_EQ(parsed.get<std::string>(), text);
            ASSERT_EQ(written, nlohmann::json(text).dump(-1, ' ', false, replace));
        }
    }
}

TEST(RowJson, CharactersThatControlHowTextIsShownAreEscaped) {
    std::string text;
    RowJson::appendText(text, "\xc2\x9b"
                              "31m \xe2\x80\xae \xd8\x9c \xe2\x81\xa9 \xc2\xa0 \xe2\x82\xac");
    EXPECT_EQ(text, "\"\\u009b31m \\u202e \\u061c \\u2069 \xc2\xa0 \xe2\x82\xac\"");
}

TEST(RowJson, EscapingKeepsADocumentsMeaning) {
    EXPECT_EQ(SteeringText::escapedInJson(
                  "{\"a\": \"x\x7f\xc2\x85y\xe2\x80\xa8\xe2\x82\xac\xc3\xa4\"}\n"),
              "{\"a\": \"x\\u007f\\u0085y\\u2028\xe2\x82\xac\xc3\xa4\"}\n");
    EXPECT_EQ(SteeringText::escapedInJson("{}"), "{}");
    EXPECT_EQ(SteeringText::escapedInJson("\"\xe2\x80"), "\"\xe2\x80");
}

} // namespace
