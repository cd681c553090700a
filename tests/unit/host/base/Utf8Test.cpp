#include "host/base/Utf8.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

std::string encoded(unsigned point) {
    const auto byte = [](unsigned value) { return static_cast<char>(value); };
    if (point < 0x80) {
        return {byte(point)};
    }
    if (point < 0x800) {
        return {byte(0xC0 | point >> 6), byte(0x80 | (point & 0x3F))};
    }
    if (point < 0x10000) {
        return {byte(0xE0 | point >> 12), byte(0x80 | (point >> 6 & 0x3F)),
                byte(0x80 | (point & 0x3F))};
    }
    return {byte(0xF0 | point >> 18), byte(0x80 | (point >> 12 & 0x3F)),
            byte(0x80 | (point >> 6 & 0x3F)), byte(0x80 | (point & 0x3F))};
}

TEST(Utf8, EveryCharacterIsValidAndNothingElseIs) {
    for (unsigned point = 0; point < 0x120000; ++point) {
        const bool isCharacter = point < 0x110000 && (point < 0xD800 || point > 0xDFFF);
        const std::string text = encoded(point);
        const Utf8::Sequence sequence = Utf8::firstSequence(text);
        ASSERT_EQ(sequence.valid, isCharacter) << point;
        ASSERT_EQ(sequence.length, isCharacter ? text.size() : 1u) << point;
        ASSERT_EQ(Utf8::validPrefix("ok" + text + "!"), isCharacter ? 3 + text.size() : 2u);
    }
}

TEST(Utf8, APieceThatIsNoCharacterEndsWhereOneCouldBegin) {
    const auto length = [](std::string_view text) {
        const Utf8::Sequence sequence = Utf8::firstSequence(text);
        EXPECT_FALSE(sequence.valid);
        return sequence.length;
    };
    EXPECT_EQ(length("\x80"), 1u);
    EXPECT_EQ(length("\xFF\x80"), 1u);
    EXPECT_EQ(length("\xC3"), 1u);
    EXPECT_EQ(length("\xC3z"), 1u);
    EXPECT_EQ(length("\xE2\x82"), 2u) << "the text ends within the character";
    EXPECT_EQ(length("\xE2\x82z"), 2u);
    EXPECT_EQ(length("\xF0\x9F\x98z"), 3u);
    EXPECT_EQ(length("\xC0\xAF"), 1u) << "an over-long form";
    EXPECT_EQ(length("\xE0\x80\xAF"), 1u);
    EXPECT_EQ(length("\xED\xA0\x80"), 1u) << "a surrogate";
    EXPECT_EQ(length("\xF5\x80\x80\x80"), 1u);
}

TEST(Utf8, FindsTheFirstByteBeyondAscii) {
    for (std::size_t size = 0; size < 80; ++size) {
        const std::string ascii(size, 'a');
        EXPECT_EQ(Utf8::asciiPrefix(ascii), size);
        EXPECT_EQ(Utf8::asciiPrefix(ascii + "\x80zz"), size);
    }
}

TEST(Utf8, PrefixNeverCutsACharacter) {
    const std::string text = "a\u00e9\u20ac\U0001F600"; // 1, 2, 3 and 4 bytes
    const std::size_t expected[] = {0, 1, 1, 3, 3, 3, 6, 6, 6, 6, 10, 10};
    for (std::size_t size = 0; size < std::size(expected); ++size) {
        EXPECT_EQ(Utf8::prefix(text, size).size(), expected[size]) << size;
    }
    EXPECT_EQ(Utf8::prefix("\x80\x80\x80\x80\x80\x80", 5).size(), 5u) << "no character at all";
    EXPECT_EQ(Utf8::prefix("\x80\x80", 1).size(), 1u);
    EXPECT_EQ(Utf8::prefix("", 5).size(), 0u);
}

} // namespace
