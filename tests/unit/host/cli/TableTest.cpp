#include "host/cli/Table.h"

#include <gtest/gtest.h>

using namespace zrm::host;

namespace {

Table logs() {
    Table table({{"LOG"}, {"STATUS", Table::FIXED}, {"SIZE", Table::NUMBER}, {"ENTRY"}});
    table.add({std::string("/var/log/auth.log"),
               {"Running", Colour::GOOD},
               std::string("4.2 kB"),
               std::string("Failed password for root from 203.0.113.7")});
    table.add({std::string("/b"), {"", Colour::NONE}, std::string("1 B"), std::string("")});
    return table;
}

Terminal ofWidth(std::size_t width) {
    Terminal terminal;
    terminal.isTerminal = true;
    terminal.width = width;
    return terminal;
}

} // namespace

TEST(TableTest, NothingIsShortenedOutsideATerminal) {
    EXPECT_EQ(logs().text({}),
              "LOG                STATUS     SIZE  ENTRY\n"
              "/var/log/auth.log  Running  4.2 kB  Failed password for root from 203.0.113.7\n"
              "/b                             1 B\n");
}

TEST(TableTest, TheWidestColumnsShrinkToFitTheTerminal) {
    EXPECT_EQ(logs().text(ofWidth(60)),
              "LOG                STATUS     SIZE  ENTRY\n"
              "/var/log/auth.log  Running  4.2 kB  Failed password for roo…\n"
              "/b                             1 B\n");
    EXPECT_EQ(logs().text(ofWidth(45)), "LOG            STATUS     SIZE  ENTRY\n"
                                        "/var/log/aut…  Running  4.2 kB  Failed passw…\n"
                                        "/b                         1 B\n");
}

TEST(TableTest, WhatStillDoesNotFitIsCutAtTheEdge) {
    EXPECT_EQ(logs().text(ofWidth(16)), "LOG         STA…\n"
                                        "/var/log/…  Run…\n"
                                        "/b\n");
}

TEST(TableTest, NoLineIsWiderThanTheTerminal) {
    for (std::size_t width = 1; width < 100; ++width) {
        const std::string text = Table(logs()).text(ofWidth(width));
        for (std::size_t from = 0; from < text.size();) {
            const std::size_t end = text.find('\n', from);
            std::size_t columns = 0;
            for (std::size_t at = from; at < end; ++at) {
                columns += (static_cast<unsigned char>(text[at]) & 0xC0) != 0x80 ? 1 : 0;
            }
            EXPECT_LE(columns, width);
            from = end + 1;
        }
    }
}

TEST(TableTest, ColoursSurroundTheTextAndNotItsPadding) {
    Table table({{"S", Table::FIXED}, {"X", Table::FIXED}});
    table.add({{"up", Colour::GOOD}, std::string("y")});
    Terminal terminal = ofWidth(80);
    terminal.hasColours = true;
    EXPECT_EQ(table.text(terminal), "\033[1mS\033[0m   \033[1mX\033[0m\n"
                                    "\033[32mup\033[0m  y\n");
}

TEST(TableTest, ControlCharactersOfACellAreShown) {
    Table table({{"ENTRY"}});
    table.add({std::string("a\nb\033[2J")});
    EXPECT_EQ(table.text({}), "ENTRY\na\\nb\\x1b[2J\n");
}
