#include "host/formats/RegexFormat.h"

#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"

#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

using namespace zrm;
using namespace zrm::host;

namespace {

constexpr const char* access =
    R"~((?P<source>\S+) \S+ (?P<user>.+?) \[(?P<time>[^\]]+)\] )~"
    R"~("(?P<description>[^"\\]*(?:\\.[^"\\]*)*)" (?P<type>(?P<status>\d{3})) (?P<bytes>\d+|-) )~"
    R"~("(?P<referer>[^"\\]*(?:\\.[^"\\]*)*)" "(?P<agent>[^"\\]*(?:\\.[^"\\]*)*)")~"
    R"~((?: (?P<request_time>\d+\.\d+))?)~";

FormatDescription described(std::vector<std::string> patterns) {
    FormatDescription description;
    description.type = "regex";
    description.patterns = std::move(patterns);
    return description;
}

/// Reads entries by a format, each from memory of exactly its size.
class Entries {
public:
    explicit Entries(const FormatDescription& description) {
        auto format = makeFormat(description);
        EXPECT_TRUE(format) << format.error().text();
        m_format = std::move(*format);
        m_reader = m_format->reader();
    }

    /// The fields, if the entry is one; why it is not, otherwise.
    std::string read(std::string_view text) {
        m_text.assign(text.begin(), text.end());
        const std::string_view entry(m_text.data(), m_text.size());
        columns = {};
        return m_reader->read(entry, columns) ? fieldsOf(entry) : std::string(m_reader->reason());
    }
    std::string fieldsOf(std::string_view entry) {
        EntryFields fields;
        m_reader->readFields(entry, fields);
        std::string result;
        for (const EntryFields::Field& field : fields.all()) {
            result.append(field.name).append("=").append(field.value).append(";");
        }
        return result;
    }

    EntryColumns columns;

private:
    std::shared_ptr<const EntryFormat> m_format;
    std::unique_ptr<EntryFormat::Reader> m_reader;
    std::vector<char> m_text;
};

TEST(RegexFormat, FillsColumnsAndFieldsFromNamedCaptures) {
    Entries entries(described({access}));
    EXPECT_EQ(entries.read(R"~(203.0.113.7 - - [19/Nov/2026:10:00:05 +0100] "GET / HTTP/1.1" )~"
                           R"~(200 53 "-" "Mozilla/5.0 (X11)" 0.004)~"),
              "user=-;status=200;bytes=53;referer=-;agent=Mozilla/5.0 (X11);request_time=0.004;");
    EXPECT_EQ(entries.columns.source, "203.0.113.7");
    EXPECT_EQ(entries.columns.type, "200");
    EXPECT_EQ(entries.columns.description, "GET / HTTP/1.1");
    EXPECT_EQ(entries.columns.system, "");
    EXPECT_EQ(entries.columns.entryClass, "");
    EXPECT_TRUE(entries.columns.hasTime && entries.columns.hasYear);
    EXPECT_EQ(entries.columns.time.second, 5U);
    EXPECT_EQ(entries.columns.offset, 3600);
}

TEST(RegexFormat, ReadsQuotesWithinQuotesNothingAndBlanks) {
    Entries entries(described({access}));
    EXPECT_EQ(
        entries.read(R"(::1 - Anna Berg [19/Nov/2026:10:00:05 +0100] "GET /\"a\" HTTP" 404 - )"
                     R"("" "a \\ \"b\"")"),
        R"(user=Anna Berg;status=404;bytes=-;referer=;agent=a \\ \"b\";)");
    EXPECT_EQ(entries.columns.description, R"(GET /\"a\" HTTP)");
    EXPECT_EQ(entries.read(R"(::1 - - [19/Nov/2026:10:00:05 +0100] "" 400 0 "-" "-")"),
              "user=-;status=400;bytes=0;referer=-;agent=-;");
    EXPECT_EQ(entries.columns.description,
              R"(::1 - - [19/Nov/2026:10:00:05 +0100] "" 400 0 "-" "-")");
}

TEST(RegexFormat, SaysWhyAnEntryIsNotRead) {
    Entries entries(described({R"((?P<time>\S+ \S+) (?P<type>[A-Z]+) )"}));
    EXPECT_EQ(entries.read(""), "it does not match the format");
    EXPECT_EQ(entries.read("x 2026-11-19 10:00:05 INFO "), "it does not match the format");
    EXPECT_EQ(entries.read("2026-11-19 25:00:05 INFO x"),
              "its time is not one that the format reads");
    EXPECT_EQ(entries.read("2026-11-19 10:00:05 INFO x"), "");
    EXPECT_EQ(entries.read("x"), "it does not match the format");
    EXPECT_FALSE(entries.columns.hasTime);
}

TEST(RegexFormat, TakesTheFirstPatternThatFits) {
    Entries entries(
        described({R"((?P<time>\S+) (?P<a>\w+): )", R"((?P<b>\w+) (?P<c>\w+))", R"((?P<d>.*))"}));
    EXPECT_EQ(entries.read("2026-11-19T10:00:05 x: y"), "a=x;");
    EXPECT_EQ(entries.read("noon x: y"), "b=noon;c=x;");
    EXPECT_EQ(entries.read("?"), "d=?;");
}

TEST(RegexFormat, ReadsTheWholeEntryAsTheDescriptionIfNothingElseIs) {
    Entries entries(described({R"((?P<type>[A-Z]+)(?: (?P<description>\w+))?(?: (?P<x>.*))?)"}));
    EXPECT_EQ(entries.read("INFO it"), "");
    EXPECT_EQ(entries.columns.description, "it");
    EXPECT_EQ(entries.read("INFO"), "");
    EXPECT_EQ(entries.columns.description, "INFO");
    EXPECT_EQ(entries.read("INFO it x\ny"), "x=x;");
}

TEST(RegexFormat, GivesAnEntryWithoutATimeNone) {
    Entries entries(described({R"((?:(?P<time>\d\S*)|-) (?P<x>.*))"}));
    EXPECT_EQ(entries.read("- y"), "x=y;");
    EXPECT_FALSE(entries.columns.hasTime);
    EXPECT_EQ(entries.read("1795082405 y"), "x=y;");
    EXPECT_TRUE(entries.columns.hasTime);
}

TEST(RegexFormat, ReadsTimesByTheFormatOfTheDescription) {
    FormatDescription description = described({R"((?P<time>[^|]*)\|)"});
    description.timeFormat = "%d.%m.%y %H Uhr %M";
    Entries entries(description);
    EXPECT_EQ(entries.read("19.11.26 10 Uhr 05|"), "");
    EXPECT_EQ(entries.columns.time.minute, 5U);
    EXPECT_EQ(entries.read("2026-11-19 10:05:00|"), "its time is not one that the format reads");
}

TEST(RegexFormat, ShowsOtherTextsInColumns) {
    FormatDescription description = described({R"((?P<type>[IW])(?P<source>\w*) (?P<x>.*))"});
    description.defaults = {{"source", "nginx"}};
    description.values = {{"type", {{"I", "INFO"}}}};
    Entries entries(description);
    EXPECT_EQ(entries.read("I y"), "x=y;");
    EXPECT_EQ(entries.columns.type, "INFO");
    EXPECT_EQ(entries.columns.source, "nginx");
    EXPECT_EQ(entries.read("Wapp y"), "x=y;");
    EXPECT_EQ(entries.columns.type, "W");
    EXPECT_EQ(entries.columns.source, "app");
}

TEST(RegexFormat, ReadsAnyBytes) {
    Entries entries(
        described({R"((?P<a>\S+) (?P<b>.{3}) \x{fc}\b(?P<c>.*))", R"((?P<a>\S+) ä(?P<b>.*))"}));
    EXPECT_EQ(entries.read(std::string_view("\xFF\0\xC3 \x80\x81\x82 \xFCx", 10)), // by RE2
              std::string("a=\xFF\0\xC3;b=\x80\x81\x82;c=x;", 16));
    EXPECT_EQ(entries.read(std::string_view("\xFF\0\xC3 ä\x80", 7)),
              std::string("a=\xFF\0\xC3;b=\x80;", 10));
}

TEST(RegexFormat, ReadsFieldsOfAnotherEntryThanTheLastOne) {
    Entries entries(described({R"((?P<a>\w+) (?P<description>\w+))"}));
    const std::string other = "other entry";
    EXPECT_EQ(entries.read("some entry"), "a=some;");
    EXPECT_EQ(entries.fieldsOf(other), "a=other;");
    EXPECT_EQ(entries.fieldsOf(other), "a=other;");
    EXPECT_EQ(entries.fieldsOf("?"), "");
    EXPECT_EQ(entries.fieldsOf("?"), "");
}

TEST(RegexFormat, ReadsLongEntriesInAMomentWhateverTheyAre) {
    Entries entries(described({R"((?P<a>(?:a|aa)+)(?P<b>.*b)(?P<c>.*c)$)", R"((?P<d>(?:x*)*y)$)",
                               R"((?P<e>\w+?)(?P<f>\w+?)(?P<g>\w+?)!)"}));
    EXPECT_EQ(entries.read(std::string(65'536, 'a')), "it does not match the format");
    EXPECT_EQ(entries.read(std::string(65'535, 'a') + "!").substr(0, 6), "e=a;f=");
}

std::string refusal(std::vector<std::string> patterns, std::string timeFormat = {}) {
    FormatDescription description = described(std::move(patterns));
    description.timeFormat = std::move(timeFormat);
    const auto format = makeFormat(description);
    EXPECT_FALSE(format);
    return format ? "" : format.error().field + ": " + format.error().text();
}

TEST(RegexFormat, RefusesWhatIsNotAFormat) {
    EXPECT_EQ(refusal({}),
              "format: a format of type \"regex\" has 1 to 16 expressions; write one, or "
              "a list of them, with captures such as (?P<time>...)");
    EXPECT_EQ(refusal(std::vector<std::string>(17, "(?P<a>.)")).substr(0, 50),
              "format: a format of type \"regex\" has 1 to 16 expre");
    EXPECT_EQ(refusal({"(?P<a>.)", "(?P<b>"}),
              "format: '(?P<b>' is not a regular expression: missing ): (?P<b>; write one in the "
              "syntax of RE2, with captures such as (?P<time>...)");
    EXPECT_EQ(
        refusal({"(a)(?=b)"}),
        "format: '(a)(?=b)' is not a regular expression: invalid perl operator: (?=; write one "
        "in the syntax of RE2, with captures such as (?P<time>...)");
    EXPECT_EQ(refusal({"(a)"}), "format: '(a)' has no named capture; name what it reads, as in "
                                "(?P<time>...)");
    EXPECT_EQ(refusal({"(?P<a>.)" + std::string(4096, 'a')}),
              "format: the expression is longer than 4096 bytes; write several that are tried in "
              "order");
    std::string groups = "(?P<a>.)";
    for (int group = 0; group < 64; ++group) {
        groups += "()";
    }
    EXPECT_EQ(refusal({groups}),
              "format: the expression has more than 64 groups; write (?:...) for "
              "groups that capture nothing");
    EXPECT_NE(refusal({"(?P<a>((.{1000}){100}){100})"}).find("is not a regular expression"),
              std::string::npos);
    EXPECT_EQ(refusal({"(?P<a>.)"}, "%Y"),
              "time_format: the format captures no time; write (?P<time>...) in it");
    EXPECT_EQ(refusal({"(?P<time>.)"}, "%Q").substr(0, 36), "time_format: '%Q' is not a directive");
}

} // namespace
