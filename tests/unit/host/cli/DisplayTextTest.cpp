#include "host/cli/DisplayText.h"

#include <gtest/gtest.h>

using namespace zrm::host;

using namespace DisplayText;

TEST(DisplayTextTest, PlainTextIsUnchanged) {
    EXPECT_EQ(visible("Failed password for root"), "Failed password for root");
    EXPECT_EQ(visible("Größe 日本 🙂"), "Größe 日本 🙂");
    EXPECT_EQ(visible(""), "");
}

TEST(DisplayTextTest, ControlCharactersAreEscaped) {
    EXPECT_EQ(visible("\033[31mred\a\r\n\tx\x7f"), "\\x1b[31mred\\x07\\r\\n\\tx\\x7f");
    EXPECT_EQ(visible(std::string("a\0b", 3)), "a\\x00b");
    EXPECT_EQ(visible("\xC2\x9B"
                      "31m"),
              "\\u009b31m"); // the 8-bit form of ESC [
}

TEST(DisplayTextTest, CharactersThatHideOrReorderTextAreEscaped) {
    EXPECT_EQ(visible("exe\xE2\x80\xAEtxt.cod"), "exe\\u202etxt.cod");
    EXPECT_EQ(visible("a\xE2\x80\x8B"
                      "b\xEF\xBB\xBF"),
              "a\\u200bb\\ufeff");
}

TEST(DisplayTextTest, InvalidUtf8IsReplaced) {
    EXPECT_EQ(visible("a\xFF"
                      "b\xC3"),
              "a\xEF\xBF\xBD"
              "b\xEF\xBF\xBD");
}

TEST(DisplayTextTest, WidthCountsColumns) {
    EXPECT_EQ(width("abc"), 3u);
    EXPECT_EQ(width("Größe"), 5u);
    EXPECT_EQ(width("日本"), 4u);
    EXPECT_EQ(width("e\xCC\x81"), 1u); // a combining accent takes none
}

TEST(DisplayTextTest, ALongTextEndsWithTheEllipsis) {
    EXPECT_EQ(shortened("abcdef", 6, "…"), "abcdef");
    EXPECT_EQ(shortened("abcdef", 5, "…"), "abcd…");
    EXPECT_EQ(shortened("abcdef", 5, "..."), "ab...");
    EXPECT_EQ(shortened("abcdef", 2, "..."), "..");
    EXPECT_EQ(shortened("abcdef", 0, "…"), "");
}

TEST(DisplayTextTest, ALongPathKeepsItsEnd) {
    EXPECT_EQ(DisplayText::shortenedPath("/var/log/a.log", 14, "…"), "/var/log/a.log");
    EXPECT_EQ(DisplayText::shortenedPath("/var/log/a.log", 10, "…"), "…log/a.log");
    EXPECT_EQ(DisplayText::shortenedPath("/var/log/a.log", 10, "..."), "...g/a.log");
    EXPECT_EQ(DisplayText::shortenedPath("/日本/a", 4, "…"), "…/a"); // a half does not fit
    EXPECT_EQ(DisplayText::shortenedPath("/var/log/a.log", 1, "…"), "…");
}

TEST(DisplayTextTest, AWideCharacterIsNotCut) {
    EXPECT_EQ(shortened("日本語", 4, "…"), "日…");
    EXPECT_EQ(beginning("日本語", 5), "日本");
}
