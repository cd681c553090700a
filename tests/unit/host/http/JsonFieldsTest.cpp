#include "host/http/JsonFields.h"

#include "unit/host/http/RefusalOf.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <string>

#include <nlohmann/json.hpp>

using namespace zrm::host;

namespace {

using testing::ElementsAre;

std::string refused(const std::string& body, const std::function<void(JsonFields&)>& read) {
    return refusalOf<JsonFields>(body, read);
}

void nothing(JsonFields& /*fields*/) {}

TEST(JsonFields, ReturnsMembersByType) {
    JsonFields fields(
        R"({"log":"/var/log/x","last":5,"where":["a","b"],"definition":{"name":"n"}})");
    EXPECT_EQ(fields.text("log"), "/var/log/x");
    EXPECT_EQ(fields.number("last", 1, 10), 5);
    EXPECT_THAT(fields.texts("where", 2), ElementsAre("a", "b"));
    JsonFields definition = fields.object("definition");
    EXPECT_EQ(definition.text("name"), "n");
    EXPECT_EQ(definition.place("name"), "definition.name");
    EXPECT_EQ(definition.place("when", 3), "definition.when[3]");
    EXPECT_EQ(fields.value("last"), 5);
    fields.refuseUnknown();
    definition.refuseUnknown();
}

TEST(JsonFields, MissingAndNullAreTheSame) {
    for (const char* const body : {"", "{}", R"({"a":null})"}) {
        JsonFields fields(body);
        EXPECT_FALSE(fields.has("a"));
        EXPECT_EQ(fields.optionalText("a"), std::nullopt);
        EXPECT_EQ(fields.optionalNumber("a", 0, 1), std::nullopt);
        EXPECT_TRUE(fields.texts("a", 1).empty());
        EXPECT_FALSE(fields.optionalObject("a"));
        EXPECT_TRUE(fields.value("a").is_null());
        fields.refuseUnknown();
        EXPECT_EQ(refused(body, [](JsonFields& f) { f.text("a"); }), "a: is missing");
        EXPECT_EQ(refused(body, [](JsonFields& f) { f.number("a", 0, 1); }), "a: is missing");
        EXPECT_EQ(refused(body, [](JsonFields& f) { f.object("a"); }), "a: is missing");
    }
}

TEST(JsonFields, RefusesBodiesThatAreNotObjects) {
    for (const char* const body : {"{", "{}x", "\"\xff\"", "{\"a\":1,}", "{\"a\":NaN}", "'"}) {
        EXPECT_EQ(refused(body, nothing), "body: the body is not JSON") << body;
    }
    for (const char* const body : {"[]", "5", "null", "\"x\""}) {
        EXPECT_EQ(refused(body, nothing), "body: write an object") << body;
    }
    EXPECT_EQ(refused(std::string(900'000, '['), nothing),
              "body: the body is nested deeper than 32");
    EXPECT_EQ(refused(R"({"a":1,"b":{"a":2},"a":3})", nothing), "a: the member appears twice");
}

TEST(JsonFields, RefusesOtherTypes) {
    const auto text = [](JsonFields& f) { f.text("a"); };
    EXPECT_EQ(refused(R"({"a":5})", text), "a: write a text");
    EXPECT_EQ(refused(R"({"a":"x\u0000"})", text), "a: write a text without NUL characters");
    const auto number = [](JsonFields& f) { f.number("a", 1, 9); };
    EXPECT_EQ(refused(R"({"a":9})", number), "accepted");
    for (const char* const value : {"0", "10", "1.5", "\"5\"", "true", "99999999999999999999"}) {
        EXPECT_EQ(refused("{\"a\":" + std::string(value) + "}", number),
                  "a: write a whole number from 1 to 9")
            << value;
    }
    const auto texts = [](JsonFields& f) { f.texts("a", 2); };
    EXPECT_EQ(refused(R"({"a":"x"})", texts), "a: write a list of at most 2 texts");
    EXPECT_EQ(refused(R"({"a":["x","y","z"]})", texts), "a: write a list of at most 2 texts");
    EXPECT_EQ(refused(R"({"a":["x",1]})", texts), "a[1]: write a text");
    EXPECT_EQ(refused(R"({"a":[]})", [](JsonFields& f) { f.object("a"); }), "a: write an object");
}

TEST(JsonFields, RefusesUnknownMembers) {
    const auto read = [](JsonFields& f) {
        f.optionalText("log");
        f.optionalText("logs");
    };
    EXPECT_EQ(refused(R"({"log":"x","where":[]})", read),
              "where: unknown member; the members are log, logs");
    EXPECT_EQ(refused(R"({"":1})", read), "\"\": unknown member; the members are log, logs");
    EXPECT_EQ(refused(R"({"":1,"":2})", read), "\"\": the member appears twice");
    EXPECT_EQ(refused(R"({"definition":{"nam":1}})",
                      [](JsonFields& f) {
                          JsonFields definition = f.object("definition");
                          definition.optionalText("name");
                          definition.refuseUnknown();
                      }),
              "definition.nam: unknown member; the members are name");
}

} // namespace
