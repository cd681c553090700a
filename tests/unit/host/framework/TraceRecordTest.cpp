#include "host/framework/TraceRecord.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

/// What a record shows of a text.
std::string shown(const std::string& text) {
    TraceRecord record({}, 1, "unit", 2);
    record.add("%s", text.c_str());
    const std::string all(record.finish());
    const std::size_t begin = all.find("unit:2 ") + 7;
    EXPECT_EQ(all.back(), '\n');
    return all.substr(begin, all.size() - begin - 1);
}

TEST(TraceRecord, ControlCharactersAreEscaped) {
    EXPECT_EQ(shown("\033]0;title\a\r\x7f"), "\\x1b]0;title\\x07\\x0d\\x7f");
    EXPECT_EQ(shown("\xc2\x9b"
                    "31m\xe2\x80\xae"),
              "\\u009b31m\\u202e");
    EXPECT_EQ(shown("\x9b"
                    "31m"),
              "\\x9b31m")
        << "a control in another code page";
}

TEST(TraceRecord, EverythingElseIsUnchanged) {
    const std::string text = "tab\tline\n\tnext caf\xc3\xa9 \xe2\x82\xac \xe9 \\x1b";
    EXPECT_EQ(shown(text), text);
}

TEST(TraceRecord, EscapesThatDoNotFitAreCut) {
    for (std::size_t size = TraceRecord::maxSize / 4 - 30; size < TraceRecord::maxSize / 4 + 30;
         ++size) {
        const std::string text = shown(std::string(size, '\033'));
        EXPECT_LT(text.size(), TraceRecord::maxSize);
        EXPECT_EQ(text.size() % 4, 0u);
        EXPECT_GE(text.size(), std::min(size * 4, TraceRecord::maxSize - 100));
    }
    shown(std::string(100'000, '\033'));
}

} // namespace
