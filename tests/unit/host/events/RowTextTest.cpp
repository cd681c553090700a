#include "host/events/RowText.h"

#include <gtest/gtest.h>

#include <clocale>
#include <cstring>

using namespace zrm::host;

namespace {

std::string textOf(std::string_view content, ColumnType type = COLUMN_CHARACTER) {
    std::string row(40, ' ');
    row.replace(8, content.size(), content);
    const RowColumn column{"TEXT", 8, 24, type};
    std::string room;
    return std::string(RowText::of(column, row.data(), room));
}

class RowTextTest : public testing::Test {
protected:
    ~RowTextTest() override { std::setlocale(LC_ALL, "C"); }
};

TEST_F(RowTextTest, IsTheTextWithoutItsPadding) {
    EXPECT_EQ(textOf("plain text"), "plain text");
    EXPECT_EQ(textOf(""), "");
    EXPECT_EQ(textOf("twenty-four bytes of text and more"), "twenty-four bytes of tex");
    EXPECT_EQ(textOf(std::string("abc\0def", 7)), "abc");
}

TEST_F(RowTextTest, KeepsValidUtf8WhateverTheLocale) {
    EXPECT_EQ(textOf("Grüße €"), "Grüße €");
    std::setlocale(LC_ALL, "C.UTF-8");
    EXPECT_EQ(textOf("Grüße €"), "Grüße €");
}

TEST_F(RowTextTest, ReplacesInvalidBytes) {
    EXPECT_EQ(textOf("a\xFF\xFEz"), "a\uFFFD\uFFFDz") << "in an ASCII locale";
    EXPECT_EQ(textOf("a\xFFz", COLUMN_UTF8), "a\uFFFDz");
    std::setlocale(LC_ALL, "C.UTF-8");
    EXPECT_EQ(textOf("a\xFFz\xE2\x82"), "a\uFFFDz\uFFFD");
    EXPECT_EQ(textOf(std::string(24, '\xFF')).size(), 72u);
}

TEST_F(RowTextTest, IsAViewIntoTheRowWherePossible) {
    char row[] = "text    ";
    const RowColumn column{"TEXT", 0, 8, COLUMN_CHARACTER};
    std::string room;
    EXPECT_EQ(RowText::of(column, row, room).data(), row);
    EXPECT_TRUE(room.empty());
}

} // namespace
