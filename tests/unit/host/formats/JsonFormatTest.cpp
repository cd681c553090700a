#include "JsonEntry.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>
#include <utility>
#include <vector>

using namespace zrm;
using namespace zrm::host;

TEST(JsonFormat, FillsTheColumnsFromTheNamedFields) {
    JsonEntry entry(withColumns({{"time", "when"},
                                 {"type", "how.bad"},
                                 {"source", "who"},
                                 {"system", "where"},
                                 {"class", "kind"},
                                 {"description", "what"}}));
    ASSERT_TRUE(entry.read(R"({"when":"2026-11-22T10:00:00Z","how":{"bad":"very"},"who":"me",)"
                           R"("where":"here","kind":"a","what":"it broke","msg":"other"})"));
    EXPECT_EQ(timeOf(entry.columns), "1795341600 UTC");
    EXPECT_EQ(entry.columns.type, "very");
    EXPECT_EQ(entry.columns.source, "me");
    EXPECT_EQ(entry.columns.system, "here");
    EXPECT_EQ(entry.columns.entryClass, "a");
    EXPECT_EQ(entry.columns.description, "it broke");
    EXPECT_EQ(entry.field("msg"), "other");
    EXPECT_EQ(entry.field("how.bad"), "very");
}

TEST(JsonFormat, FillsNothingFromAColumnWithAnEmptyName) {
    JsonEntry entry(withColumns({{"source", ""}, {"type", "level"}, {"class", "level"}}));
    ASSERT_TRUE(entry.read(R"({"level":"info","logger":"web","msg":"m"})"));
    EXPECT_EQ(entry.columns.source, "");
    EXPECT_EQ(entry.columns.type, "info");
    EXPECT_EQ(entry.columns.entryClass, "info");
    EXPECT_EQ(entry.columns.description, "m");
}

namespace {

struct Logged {
    const char* writer;
    const char* text;
    const char* time;
    const char* type;
    const char* source;
    const char* description;
    const char* system = "";
};

void PrintTo(const Logged& logged, std::ostream* out) {
    *out << logged.writer;
}

class JsonWriters : public testing::TestWithParam<Logged> {};

constexpr Logged written[] = {
    {"slog", R"({"time":"2026-11-22T10:00:00.123456789+01:00","level":"WARN","msg":"slow","n":3})",
     "1795338000 UTC", "WARN", "", "slow"},
    {"zap", R"({"level":"info","ts":1795341600.2711,"logger":"web","caller":"a.go:7","msg":"up"})",
     "1795341600 UTC", "info", "web", "up"},
    {"zapWithoutLogger", R"({"level":"error","ts":1795341600,"caller":"main.go:12","msg":"x"})",
     "1795341600 UTC", "error", "main.go:12", "x"},
    {"pino", R"({"level":30,"time":1795341600123,"pid":7,"hostname":"web1","msg":"listening"})",
     "1795341600 UTC", "INFO", "", "listening", "web1"},
    {"bunyan",
     R"({"name":"api","hostname":"web1","pid":7,"level":50,"msg":"no","time":"2026-11-22T10:00:00Z","v":0})",
     "1795341600 UTC", "ERROR", "api", "no", "web1"},
    {"logback",
     R"({"@timestamp":"2026-11-22T10:00:00.1Z","@version":"1","message":"m","logger_name":"a.B","thread_name":"main","level":"DEBUG","level_value":10000})",
     "1795341600 UTC", "DEBUG", "a.B", "m"},
    {"ecs",
     R"({"@timestamp":"2026-11-22T10:00:00Z","log.level":"INFO","message":"m","log.logger":"a.B","host":{"name":"h"}})",
     "1795341600 UTC", "INFO", "a.B", "m", "h"},
    {"log4j2",
     R"({"instant":{"epochSecond":1795341600,"nanoOfSecond":1},"level":"WARN","loggerName":"L","message":"m"})",
     "1795341600 UTC", "WARN", "L", "m"},
    {"python",
     R"({"asctime": "2026-11-22 10:00:00,123", "levelname": "INFO", "name": "root", "message": "m"})",
     "1795341600 local", "INFO", "root", "m"},
    {"structlog", R"({"event":"started","level":"info","timestamp":"2026-11-22T10:00:00Z"})",
     "1795341600 UTC", "info", "", "started"},
    {"tracing",
     R"({"timestamp":"2026-11-22T10:00:00Z","level":"INFO","fields":{"message":"m","n":1},"target":"app::web"})",
     "1795341600 UTC", "INFO", "app::web", "m"},
    {"serilog",
     R"({"@t":"2026-11-22T10:00:00Z","@mt":"Hello {Who}","@l":"Warning","SourceContext":"App.Web"})",
     "1795341600 UTC", "Warning", "App.Web", "Hello {Who}"},
    {"gelf",
     R"({"version":"1.1","host":"web1","short_message":"m","timestamp":1795341600.5,"level":4})",
     "1795341600 UTC", "warning", "", "m", "web1"},
    {"journal",
     R"({"MESSAGE":"m","PRIORITY":"3","_HOSTNAME":"h","SYSLOG_IDENTIFIER":"sshd","__REALTIME_TIMESTAMP":"1795341600000000"})",
     "1795341600 UTC", "err", "sshd", "m", "h"},
    {"hclog",
     R"({"@level":"info","@message":"m","@module":"core","@timestamp":"2026-11-22T10:00:00Z"})",
     "1795341600 UTC", "info", "core", "m"},
    {"openTelemetry",
     R"({"timeUnixNano":"1795341600000000000","severityText":"ERROR","severityNumber":17,"body":{"stringValue":"m"}})",
     "1795341600 UTC", "ERROR", "", "m"},
    {"containerFile",
     R"({"log":"hello\n","stream":"stderr","time":"2026-11-22T10:00:00.123456789Z"})",
     "1795341600 UTC", "stderr", "", "hello\n"},
    {"mongo",
     R"({"t":{"$date":"2026-11-22T10:00:00.1+00:00"},"s":"I","c":"NETWORK","ctx":"listener","msg":"m"})",
     "1795341600 UTC", "", "", "m"},
};

} // namespace

INSTANTIATE_TEST_SUITE_P(All, JsonWriters, testing::ValuesIn(written),
                         [](const auto& test) { return test.param.writer; });

TEST_P(JsonWriters, AreReadWithoutConfiguration) {
    const Logged& logged = GetParam();
    JsonEntry entry;
    ASSERT_TRUE(entry.read(logged.text)) << entry.reader().reason();
    EXPECT_EQ(timeOf(entry.columns), logged.time);
    EXPECT_EQ(entry.columns.type, logged.type);
    EXPECT_EQ(entry.columns.source, logged.source);
    EXPECT_EQ(entry.columns.description, logged.description);
    EXPECT_EQ(entry.columns.system, logged.system);
}

TEST(JsonFormat, PrefersEarlierNamesWhereverTheyAre) {
    JsonEntry entry;
    ASSERT_TRUE(
        entry.read(R"({"event":"e","message":"m","MSG":"first","caller":"c","Logger":"l"})"));
    EXPECT_EQ(entry.columns.description, "first");
    EXPECT_EQ(entry.columns.source, "l");
    ASSERT_TRUE(entry.read(R"({"time":"0:00.5","ts":"soon","@timestamp":1795341600})"));
    EXPECT_EQ(timeOf(entry.columns), "1795341600 UTC");
}

TEST(JsonFormat, PrefersATimeWithADateToATimeOfDay) {
    JsonEntry entry;
    ASSERT_TRUE(entry.read(R"({"time":"10:00:05.123","ts":1795341600,"msg":"m"})"));
    EXPECT_EQ(timeOf(entry.columns), "1795341600 UTC");
    ASSERT_TRUE(entry.read(R"({"time":"10:00:05.123","ts":"soon","msg":"m"})"));
    EXPECT_FALSE(entry.columns.hasTime);
    EXPECT_TRUE(entry.columns.hasTimeOfDay);
    EXPECT_EQ(entry.columns.time.second, 5u);
}

TEST(JsonFormat, LeavesColumnsEmptyThatTheObjectDoesNotHave) {
    JsonEntry entry;
    ASSERT_TRUE(entry.read(R"({"n":1})"));
    EXPECT_FALSE(entry.columns.hasTime);
    EXPECT_EQ(entry.columns.type, "");
    EXPECT_EQ(entry.columns.description, R"({"n":1})");
    ASSERT_TRUE(entry.read(R"({"msg":""})"));
    EXPECT_EQ(entry.columns.description, R"({"msg":""})");
    ASSERT_TRUE(entry.read("{}"));
    EXPECT_EQ(entry.columns.description, "{}");
    EXPECT_TRUE(entry.fields.all().empty());
}

TEST(JsonFormat, ExchangesAndFillsTexts) {
    FormatDescription description = withColumns({{"type", "level"}});
    description.values["type"] = {{"30", "information"}};
    description.defaults = {{"source", "app"}, {"description", "nothing"}};
    JsonEntry entry(description);
    ASSERT_TRUE(entry.read(R"({"level":30})"));
    EXPECT_EQ(entry.columns.type, "information");
    EXPECT_EQ(entry.columns.source, "app");
    EXPECT_EQ(entry.columns.description, "nothing");
    ASSERT_TRUE(entry.read(R"({"level":40})"));
    EXPECT_EQ(entry.columns.type, "40") << "values says what the numbers are";
}

TEST(JsonFormat, NamesNumericLevels) {
    JsonEntry entry;
    const auto typeOf = [&](const char* text) {
        return entry.read(text) ? std::string(entry.columns.type) : "rejected";
    };
    EXPECT_EQ(typeOf(R"({"level":10})"), "TRACE");
    EXPECT_EQ(typeOf(R"({"level":60})"), "FATAL");
    EXPECT_EQ(typeOf(R"({"level":70})"), "70");
    EXPECT_EQ(typeOf(R"({"level":35})"), "35");
    EXPECT_EQ(typeOf(R"({"level":3})"), "3");
    EXPECT_EQ(typeOf(R"({"level":"30"})"), "30");
    EXPECT_EQ(typeOf(R"({"severity":30})"), "30");
    EXPECT_EQ(typeOf(R"({"level":7,"short_message":"m"})"), "debug");
    EXPECT_EQ(typeOf(R"({"level":8,"short_message":"m"})"), "8");
    EXPECT_EQ(typeOf(R"({"priority":0})"), "emerg");
    EXPECT_EQ(typeOf(R"({"PRIORITY":"high"})"), "high");
}

TEST(JsonFormat, ReadsTimesByTheGivenPattern) {
    FormatDescription description = withColumns({{"time", "at"}});
    description.timeFormat = "%d/%m/%Y %H-%M-%S";
    JsonEntry entry(description);
    ASSERT_TRUE(entry.read(R"({"at":"22/11/2026 10-00-00"})"));
    EXPECT_EQ(timeOf(entry.columns), "1795341600 local");
    EXPECT_EQ(entry.reasonOf(R"({"at":"2026-11-22T10:00:00Z"})"), "field at is not a time");
    ASSERT_TRUE(entry.read(R"({"time":"2026-11-22T10:00:00Z"})"));
    EXPECT_FALSE(entry.columns.hasTime) << "only the named field has the time";
}

TEST(JsonFormat, NamesFieldsOfNestedObjectsAndArrays) {
    JsonEntry entry;
    ASSERT_TRUE(entry.read(
        R"({"http":{"request":{"method":"GET"},"status":503},"tags":["a",["b",{"c":"d"}]],)"
        R"("e":{},"f":[],"g":null,"h":[null,1]})"));
    ASSERT_EQ(entry.fields.all().size(), 6u);
    EXPECT_EQ(entry.field("http.request.method"), "GET");
    EXPECT_EQ(entry.field("http.status"), "503");
    EXPECT_EQ(entry.field("tags.0"), "a");
    EXPECT_EQ(entry.field("tags.1.0"), "b");
    EXPECT_EQ(entry.field("tags.1.1.c"), "d");
    EXPECT_EQ(entry.field("h.1"), "1");
}

TEST(JsonFormat, KeepsScalarsAsTheyAreWritten) {
    JsonEntry entry;
    ASSERT_TRUE(entry.read(
        R"({"a": 1.50 , "b":-0,"c":12345678901234567890123456789,"d":1E+400,"e":true,"f":false , "g":""})"));
    EXPECT_EQ(entry.field("a"), "1.50");
    EXPECT_EQ(entry.field("b"), "-0");
    EXPECT_EQ(entry.field("c"), "12345678901234567890123456789");
    EXPECT_EQ(entry.field("d"), "1E+400");
    EXPECT_EQ(entry.field("e"), "true");
    EXPECT_EQ(entry.field("f"), "false");
    EXPECT_EQ(entry.field("g"), "");
}

TEST(JsonFormat, RemovesEscapes) {
    JsonEntry entry;
    ASSERT_TRUE(entry.read(
        R"({"msg":"a \"b\" \\ \/ \n\t\u00e4\ud83d\ude00","k\"e\u0079":"v","in":{"\u0061":"\\"},"plain":"p"})"));
    EXPECT_EQ(entry.columns.description, "a \"b\" \\ / \n\t\xc3\xa4\xf0\x9f\x98\x80");
    EXPECT_EQ(entry.field("k\"ey"), "v");
    EXPECT_EQ(entry.field("in.a"), "\\");
    EXPECT_EQ(entry.field("plain"), "p");
}

TEST(JsonFormat, CountsTheFirstOfMembersWithTheSameName) {
    JsonEntry entry;
    ASSERT_TRUE(entry.read(R"({"msg":"first","a":1,"msg":"second","a":2,"b":{"c":3},"b.c":4})"));
    EXPECT_EQ(entry.columns.description, "first");
    EXPECT_EQ(entry.field("a"), "1");
    EXPECT_EQ(entry.field("b.c"), "3");
    EXPECT_EQ(entry.fields.all().size(), 3u);
}
