#include "host/framework/Converter.h"

#include "host/base/Utf8.h"

#include <gtest/gtest.h>

#include <string>
#include <thread>

using namespace zrm::host;

namespace {

constexpr std::uint32_t utf8 = 1208;
constexpr std::uint32_t asciiPage = 367;
constexpr std::uint32_t latin1 = 819;
constexpr std::uint32_t latin9 = 923;
constexpr std::uint32_t shiftJis = 932;
constexpr std::uint32_t eucJp = 954;

struct Outcome {
    std::string text;
    bool complete;
};

/// Converts into a target of this size and checks that nothing after it is touched.
Outcome convert(std::uint32_t to, std::uint32_t from, std::string_view source,
                std::size_t size = 1000) {
    std::string target(size + 8, '#');
    const Converted converted = Converter::convert(*CodePages::byNumber(to), target.data(), size,
                                                   *CodePages::byNumber(from), source);
    EXPECT_TRUE(converted.supported);
    EXPECT_LE(converted.written, size);
    EXPECT_EQ(target.substr(converted.written), std::string(size + 8 - converted.written, '#'));
    return {target.substr(0, converted.written), converted.complete};
}

std::string text(std::uint32_t to, std::uint32_t from, std::string_view source) {
    const Outcome outcome = convert(to, from, source);
    EXPECT_TRUE(outcome.complete);
    return outcome.text;
}

TEST(Converter, PassesAsciiThroughBetweenAllCodeSets) {
    const std::string ascii("plain \0 text ~\\\n\x7f and more of it", 31);
    for (const std::uint32_t to : {utf8, asciiPage, latin1, shiftJis}) {
        for (const std::uint32_t from : {utf8, asciiPage, latin1, shiftJis}) {
            EXPECT_EQ(text(to, from, ascii), ascii);
            EXPECT_EQ(text(to, from, ""), "");
        }
    }
}

TEST(Converter, ConvertsBetweenCodeSets) {
    EXPECT_EQ(text(utf8, latin1,
                   "Gr\xFC\xDF"
                   "e"),
              "Grüße");
    EXPECT_EQ(text(latin1, utf8, "Grüße"), "Gr\xFC\xDF"
                                           "e");
    EXPECT_EQ(text(utf8, latin9, "\xA4"), "€");
    EXPECT_EQ(text(utf8, eucJp, "\xC6\xFC\xCB\xDC"), "日本");
    EXPECT_EQ(text(shiftJis, utf8, "日本"), "\x93\xFA\x96\x7B");
    EXPECT_EQ(text(latin9, latin1, "a\xE9"), "a\xE9");
}

TEST(Converter, ReplacesInvalidCharactersOfTheSource) {
    EXPECT_EQ(text(utf8, utf8,
                   "a\xFF"
                   "b"),
              "a\uFFFDb");
    EXPECT_EQ(text(utf8, utf8, "\xE2\x82"), "\uFFFD") << "one for a character that is cut";
    EXPECT_EQ(text(utf8, utf8, "\xED\xA0\x80"), "\uFFFD\uFFFD\uFFFD");
    EXPECT_EQ(text(utf8, utf8, "Grüße\x80!"), "Grüße\uFFFD!");
    EXPECT_EQ(text(utf8, asciiPage, "a\xE9z"), "a\uFFFDz");
    EXPECT_EQ(text(asciiPage, asciiPage, "a\xE9\xE8z"), "a\x1A\x1Az");
    EXPECT_EQ(text(utf8, eucJp, "\xC6\xFCz\xFFz"), "日z\uFFFDz");
    EXPECT_EQ(text(utf8, shiftJis, "a\x93"), "a\uFFFD") << "the text ends within a character";
}

TEST(Converter, ReplacesCharactersThatTheTargetLacks) {
    EXPECT_EQ(text(latin1, utf8, "5 € é"), "5 \x1A \xE9") << "one for the whole character";
    EXPECT_EQ(text(asciiPage, utf8, "\U0001F600!"), "\x1A!");
    EXPECT_EQ(text(latin1, utf8, "a\xFF\xE2\x82"), "a\x1A\x1A");
    EXPECT_EQ(text(shiftJis, utf8, "\U0001F600"), "?");
}

TEST(Converter, EqualCodeSetsOfSingleBytesKeepEveryByte) {
    std::string all;
    for (int byte = 0; byte < 256; ++byte) {
        all += static_cast<char>(byte);
    }
    EXPECT_EQ(text(latin1, latin1, all), all);
    EXPECT_EQ(text(eucJp, eucJp, "\xC6\xFC\xFF"), "\xC6\xFC?");
}

TEST(Converter, AFullTargetEndsAtACharacter) {
    const auto cut = [](std::uint32_t to, std::uint32_t from, std::string_view source,
                        std::size_t size) {
        const Outcome outcome = convert(to, from, source, size);
        EXPECT_FALSE(outcome.complete) << source << ' ' << size;
        return outcome.text;
    };
    EXPECT_EQ(cut(utf8, utf8, "abcdef", 4), "abcd");
    EXPECT_EQ(cut(utf8, utf8, "abcdef", 0), "");
    EXPECT_EQ(cut(utf8, utf8, "ab€", 4), "ab");
    EXPECT_EQ(cut(utf8, utf8, "ab€d", 5), "ab€");
    EXPECT_EQ(cut(utf8, utf8, "ab\xFF", 4), "ab") << "the replacement does not fit either";
    EXPECT_EQ(cut(utf8, latin9, "ab\xA4", 4), "ab");
    EXPECT_EQ(cut(utf8, latin9, "ab\xA4\xA4", 5), "ab€");
    EXPECT_EQ(cut(utf8, asciiPage, "ab\xFF", 4), "ab");
    EXPECT_EQ(cut(latin1, latin1, "a\xE9\xE9\xE9", 2), "a\xE9");
    EXPECT_EQ(cut(asciiPage, asciiPage, "a\xE9\xE9\xE9", 2), "a\x1A");
    EXPECT_EQ(cut(asciiPage, asciiPage, "\xE9zz", 2), "\x1Az");
    EXPECT_EQ(cut(shiftJis, utf8, "日本", 3), "\x93\xFA");
    EXPECT_EQ(convert(utf8, utf8, "ab€", 5).text, "ab€");
    EXPECT_TRUE(convert(utf8, utf8, "ab€", 5).complete);
    EXPECT_TRUE(convert(utf8, latin9, "ab\xA4", 5).complete);
    EXPECT_TRUE(convert(utf8, utf8, "", 0).complete);
}

// Some converters hold a letter back until they know that no accent follows it.
TEST(Converter, LosesNoCharacterThatAConverterHeldBack) {
    EXPECT_EQ(text(utf8, 1258, "\xE9 a"), "é a");
    EXPECT_EQ(text(utf8, 1258, "\xF0\xE2"), "đâ");
    EXPECT_EQ(text(utf8, 1258, "\xF0\xE2\xD2z"), text(utf8, 1258, "\xF0") + "ẩz");
    EXPECT_EQ(text(utf8, 1255, "\xE0\xFFz"), "א\uFFFDz");
    for (std::size_t size = 0; size <= 4; ++size) {
        EXPECT_EQ(convert(utf8, 1258, "\xF0\xE2", size).text, Utf8::prefix("đâ", size));
    }
}

// A target of any size gets a prefix of the whole, and never half a character.
TEST(Converter, FillsTargetsOfEverySize) {
    const std::string source = "a\xA4z\xE9\xE9 end";
    const std::string whole = text(utf8, latin9, source);
    for (std::size_t size = 0; size <= whole.size(); ++size) {
        const Outcome outcome = convert(utf8, latin9, source, size);
        EXPECT_EQ(outcome.text, Utf8::prefix(whole, size));
        EXPECT_EQ(outcome.complete, size == whole.size());
    }
}

TEST(Converter, KeepsMoreThanOnePairPerThread) {
    constexpr std::uint32_t pages[] = {latin1, latin9, eucJp, shiftJis, 850, 1252, 878};
    for (int round = 0; round < 3; ++round) {
        for (const std::uint32_t page : pages) {
            const std::string back = text(page, utf8, "Я é 日");
            EXPECT_FALSE(text(utf8, page, back).empty());
        }
        EXPECT_EQ(text(utf8, latin1, "\xE9"), "é");
    }
}

TEST(Converter, ThreadsConvertAtOnce) {
    std::vector<std::thread> threads;
    for (int i = 0; i < 8; ++i) {
        threads.emplace_back([] {
            for (int round = 0; round < 500; ++round) {
                ASSERT_EQ(text(utf8, latin1, "Gr\xFC\xDF"), "Grüß");
                ASSERT_EQ(text(latin1, utf8, "Grüß"), "Gr\xFC\xDF");
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}

TEST(Converter, ReportsUnsupportedConversions) {
    const LOC2_Locale strange{"NO-SUCH-CODE-SET", 4711, true};
    char target[8] = "#######";
    const Converted converted =
        Converter::convert(*CodePages::byNumber(utf8), target, sizeof target, strange, "a\xE9");
    EXPECT_FALSE(converted.supported);
    EXPECT_EQ(converted.written, 0u);
}

} // namespace
