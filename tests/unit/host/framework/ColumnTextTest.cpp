#include "host/framework/ColumnText.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

TEST(ColumnText, EndsAtTheFirstNulWithoutTrailingBlanks) {
    EXPECT_EQ(ColumnText::unpadded("abc   ", 6), "abc");
    EXPECT_EQ(ColumnText::unpadded("abc  \0zz", 8), "abc");
    EXPECT_EQ(ColumnText::unpadded(" a b  ", 6), " a b");
    EXPECT_EQ(ColumnText::unpadded("abcdef", 6), "abcdef");
    EXPECT_EQ(ColumnText::unpadded("abcdef", 3), "abc");
    EXPECT_EQ(ColumnText::unpadded("      ", 6), "");
    EXPECT_EQ(ColumnText::unpadded("\0bcdef", 6), "");
    EXPECT_EQ(ColumnText::unpadded("", 0), "");
}

TEST(ColumnText, FindsTheEndOfTheTextBeforeAnyAmountOfPadding) {
    for (std::size_t size = 0; size <= 70; ++size) {
        for (std::size_t padding = 0; padding <= 70; ++padding) {
            const std::string text = std::string(size, 'x');
            const std::string field = text + std::string(padding, ' ');
            EXPECT_EQ(ColumnText::unpadded(field.data(), field.size()), text);
            EXPECT_EQ(ColumnText::isPadding(field.data(), field.size()), size == 0);
            const std::string reversed(field.rbegin(), field.rend());
            EXPECT_EQ(ColumnText::isPadding(reversed.data(), padding), true);
            EXPECT_EQ(ColumnText::isPadding((reversed + "!").data(), padding + 1), false);
        }
    }
}

TEST(ColumnText, PaddingIsBlanksUpToANulOrTheEnd) {
    EXPECT_TRUE(ColumnText::isPadding("", 0));
    EXPECT_TRUE(ColumnText::isPadding("   ", 3));
    EXPECT_TRUE(ColumnText::isPadding("  \0x", 4));
    EXPECT_TRUE(ColumnText::isPadding("   x", 3));
    EXPECT_FALSE(ColumnText::isPadding("  x ", 4));
}

TEST(ColumnText, ComparesAsIfPaddedWithBlanks) {
    EXPECT_EQ(ColumnText::compare("abc   ", 6, "abc"), 0);
    EXPECT_EQ(ColumnText::compare("abc\0zz", 6, "abc  "), 0);
    EXPECT_EQ(ColumnText::compare("abc", 3, "abc      "), 0);
    EXPECT_LT(ColumnText::compare("abc   ", 6, "abd"), 0);
    EXPECT_GT(ColumnText::compare("abd   ", 6, "abc"), 0);
    EXPECT_LT(ColumnText::compare("abc   ", 6, "abc!"), 0);
    EXPECT_GT(ColumnText::compare("abc\t  ", 6, "abc\x01"), 0);
    // A control character is less than the blank that pads the other side.
    EXPECT_LT(ColumnText::compare("abc\t  ", 6, "abc"), 0);
    EXPECT_GT(ColumnText::compare("\xE9     ", 6, "z"), 0);
}

} // namespace
