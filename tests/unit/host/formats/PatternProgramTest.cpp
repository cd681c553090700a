#include "host/formats/PatternProgram.h"

#include <random>
#include <string>
#include <string_view>
#include <vector>

#include <gtest/gtest.h>
#include <re2/re2.h>

using namespace zrm::host;

namespace {

using Outcome = PatternProgram::Outcome;

re2::RE2::Options bytes() {
    re2::RE2::Options options;
    options.set_encoding(re2::RE2::Options::EncodingLatin1);
    options.set_log_errors(false);
    return options;
}

/// The groups of a match as texts in brackets, "-" for one that takes no part; "no" for none.
std::string byLibrary(const re2::RE2& expression, std::string_view text) {
    std::vector<re2::StringPiece> groups(
        static_cast<std::size_t>(expression.NumberOfCapturingGroups()) + 1);
    if (!expression.Match(re2::StringPiece(text.data(), text.size()), 0, text.size(),
                          re2::RE2::ANCHOR_START, groups.data(), static_cast<int>(groups.size()))) {
        return "no";
    }
    std::string result;
    for (std::size_t index = 1; index < groups.size(); ++index) {
        result += groups[index].data() == nullptr ? "-" : "[" + groups[index].as_string() + "]";
    }
    return result;
}

std::string byProgram(const PatternProgram& program, std::string_view text) {
    std::vector<const char*> places(2 * program.groups());
    switch (program.match(text, places)) {
    case Outcome::noMatch:
        return "no";
    case Outcome::unknown:
        return "unknown";
    case Outcome::match:
        break;
    }
    std::string result;
    for (std::size_t index = 0; index < places.size(); index += 2) {
        result += places[index] == nullptr
                      ? "-"
                      : "[" + std::string(places[index], places[index + 1]) + "]";
    }
    return result;
}

std::string match(const std::string& pattern, std::string_view text) {
    const auto program = PatternProgram::compile(pattern);
    if (!program) {
        return "not known";
    }
    const std::string result = byProgram(*program, text);
    EXPECT_EQ(result, byLibrary(re2::RE2(pattern, bytes()), text)) << pattern << " on " << text;
    return result;
}

TEST(PatternProgram, TakesEntriesApart) {
    EXPECT_EQ(match(R"((?P<time>\S+ \S+) (\w+): (.*))", "2026-11-19 10:00:05 INFO: it: runs\nand"),
              "[2026-11-19 10:00:05][INFO][it: runs]");
    EXPECT_EQ(match(R"((?s)(\w+) (.*))", "a b\nc"), "[a][b\nc]");
    EXPECT_EQ(match(R"((?i)([a-c]+)X(.))", "aBcXx\xE4"), "[aBc][x]");
    EXPECT_EQ(match(R"((\d{3}|-)(?: (\d+\.\d+))?$)", "200 1.5"), "[200][1.5]");
    EXPECT_EQ(match(R"((\d{3}|-)(?: (\d+\.\d+))?$)", "-"), "[-]-");
    EXPECT_EQ(match(R"((\d{3}|-)(?: (\d+\.\d+))?$)", "200 "), "no");
    EXPECT_EQ(match(R"((.+?) \[(.*)\] (.*?)!)", "Anna Berg [a] [b] c!d!"), "[Anna Berg][a] [b][c]");
    EXPECT_EQ(match(R"~("([^"\\]*(?:\\.[^"\\]*)*)" (\d+))~", R"~("a \"b\" c" 7)~"),
              R"~([a \"b\" c][7])~");
    EXPECT_EQ(match(R"~("((?:[^"\\]|\\.)*)")~", R"~("a \"b\\" c")~"), R"~([a \"b\\])~");
    EXPECT_EQ(match(R"((?:(a)|(b)|c)+(d?))", "abcd"), "[a][b][d]");
    EXPECT_EQ(match("(a|ab)(c|bcd)(d*)", "abcd"), "[a][bcd][]");
    EXPECT_EQ(match("^(a*?)(a*)$", "aaa"), "[][aaa]");
    EXPECT_EQ(match("([^ ]*)$", "a\nb"), "[a\nb]");
    EXPECT_EQ(match("([-a-c.]+)([\\]x-]*)", "a-b.]x-y"), "[a-b.][]x-]");
    EXPECT_EQ(match("(\\D+)(\\W*)", std::string_view("a\0\xFF 1", 5)),
              std::string("[a\0\xFF ][]", 8));
    EXPECT_EQ(match("()", ""), "[]");
    EXPECT_EQ(match("(.*)", ""), "[]");
    EXPECT_EQ(match("(a)", ""), "no");
}

TEST(PatternProgram, LeavesToTheLibraryWhatItDoesNotKnow) {
    for (const char* pattern :
         {R"(a\b)", "(?m)a$",       "(?i:a)",      "a{2,3}?", "(ab){2}", "(a*)*",   "(a|b?)+",
          "(a)*?",  "a??",          "[[:alpha:]]", "[]a]",    R"(\pL)",  R"(\x41)", R"(\Qa\E)",
          "a^",     "(?i)\xC3\xA4", "a{",          "a{,2}",   "(?s-i)a", "(a))",    "(a",
          "[a",     "\\",           "(?P<a",       "a{0}"}) {
        EXPECT_FALSE(PatternProgram::compile(pattern)) << pattern;
    }
}

TEST(PatternProgram, IsBoundedInSize) {
    std::string nested = "a";
    for (int depth = 0; depth < 40; ++depth) {
        nested = "(" + nested + ")+";
    }
    EXPECT_FALSE(PatternProgram::compile(nested));
    std::string doubled = "a";
    for (int depth = 0; depth < 20; ++depth) {
        doubled = "(?:" + doubled + ")+";
    }
    EXPECT_FALSE(PatternProgram::compile(doubled));
    std::string groups;
    for (int group = 0; group < 65; ++group) {
        groups += "(a)";
    }
    EXPECT_FALSE(PatternProgram::compile(groups));
}

TEST(PatternProgram, GivesUpWhereItWouldLookAtTheSameTextAgainAndAgain) {
    const std::string text(60'000, 'a');
    for (const char* pattern : {"(?:a|aa)+b", "(.*)(.*)(.*)b", "(.+?)(.+?)(.+?)b", "(?:(a)|a)*b"}) {
        const auto program = PatternProgram::compile(pattern);
        ASSERT_TRUE(program) << pattern;
        EXPECT_EQ(byProgram(*program, text), "unknown") << pattern;
    }
}

/// Expressions and texts over few bytes, so that the texts often match.
class Random {
public:
    explicit Random(unsigned seed) : m_engine(seed) {}

    std::size_t below(std::size_t limit) {
        return std::uniform_int_distribution<std::size_t>(0, limit - 1)(m_engine);
    }
    std::string pattern(int depth = 0) {
        std::string result = sequence(depth);
        for (std::size_t more = depth == 0 ? 0 : below(5); more == 4; --more) {
            result += "|" + sequence(depth);
        }
        return result;
    }
    std::string text() {
        std::string result;
        for (std::size_t length = below(30); length > 0; --length) {
            result += R"(aaabb  12"\.[]-:)"[below(16)];
            if (below(40) == 0) {
                result += '\n';
            }
        }
        return result;
    }

private:
    std::string sequence(int depth) {
        std::string result;
        for (std::size_t length = below(5) + (depth == 0 ? 1 : 0); length > 0; --length) {
            result += piece(depth);
        }
        return below(20) == 0 ? result + "$" : result;
    }
    std::string piece(int depth) {
        if (depth < 3 && below(4) == 0) {
            const char* const brackets[] = {"(?:", "(", "(?P<"};
            const std::size_t kind = below(3);
            const std::string name = kind == 2 ? "n" + std::to_string(++m_names) + ">" : "";
            const char* const counts[] = {"", "", "?", "*", "+", "??"};
            return brackets[kind] + name + pattern(depth + 1) + ")" + counts[below(6)];
        }
        const char* const bytes[] = {"a",      "b",    " ",     "\\d",       "\\S",   "\\w",
                                     ".",      "[ab]", "[^\"]", "[^\"\\\\]", "\\\\.", "[^ :]",
                                     "\"",     "\\[",  ":",     "[\\d.]",    "\\s",   "1",
                                     "[a-b-]", "ab",   "\\D"};
        const char* const counts[] = {"",  "",   "",   "",    "*",     "+",
                                      "?", "*?", "+?", "{2}", "{1,2}", "{2,}"};
        return std::string(bytes[below(21)]) + counts[below(12)];
    }

    std::mt19937 m_engine;
    int m_names = 0;
};

constexpr int texts = 30; ///< for each expression

class PatternProgramModel : public testing::TestWithParam<unsigned> {};

TEST_P(PatternProgramModel, SaysWhatTheLibrarySays) {
    Random random(GetParam());
    int known = 0;
    int matches = 0;
    int unknown = 0;
    for (int round = 0; round < 1'000; ++round) {
        const std::string pattern = random.pattern();
        const re2::RE2 expression(pattern, bytes());
        const auto program = PatternProgram::compile(pattern);
        if (!expression.ok() || !program) {
            continue;
        }
        ++known;
        for (int round = 0; round < texts; ++round) {
            const std::string text = random.text();
            const std::string result = byProgram(*program, text);
            if (result == "unknown") {
                ++unknown;
                continue;
            }
            matches += result == "no" ? 0 : 1;
            ASSERT_EQ(result, byLibrary(expression, text)) << pattern << " on " << text;
        }
    }
    EXPECT_GT(known, 500);
    EXPECT_GT(matches, 1'000);
    EXPECT_LT(unknown, known * texts / 100);
}

INSTANTIATE_TEST_SUITE_P(Seeds, PatternProgramModel, testing::Range(1U, 9U));

} // namespace
