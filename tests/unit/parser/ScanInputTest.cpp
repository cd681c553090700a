#include "ParserProbe.h"

#include "support/Faults.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>

using namespace zrm;

// Lines scanned with a learned format and printed into the buffers of the fields.

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/// The messages of a line that does not match.
std::vector<std::string> errorsOf(const std::string& format, const std::string& line) {
    ParserProbe parser(format);
    EXPECT_TRUE(parser.isLearned());
    RecordingTrace trace(TRC1_ERROR);
    TestBuffers buffers;
    EXPECT_EQ(parser.formatLine(line.c_str(), buffers.get()), -1);
    return trace.messages();
}

/// The text of a line's one field, or "unfit" if the line does not match.
std::string printed(const std::string& format, const std::string& line,
                    const char* keyword = "description") {
    ParserProbe parser(format);
    EXPECT_TRUE(parser.isLearned()) << format;
    TestBuffers buffers;
    return parser.formatLine(line.c_str(), buffers.get()) > 0 ? buffers.text(keyword) : "unfit";
}

TEST(ScanInput, WritesEachFieldIntoTheBufferOfItsKeyword) {
    ParserProbe parser("A,\"%d-%d %31s %[^\n]\", month day = \"%02d\" source description");
    TestBuffers buffers;
    EXPECT_EQ(parser.formatLine("11-7 sshd Failed password for root\n", buffers.get()), 4);
    EXPECT_EQ(buffers.text("month"), "11");
    EXPECT_EQ(buffers.text("day"), "07");
    EXPECT_EQ(buffers.text("source"), "sshd");
    EXPECT_EQ(buffers.text("description"), "Failed password for root");
    EXPECT_EQ(buffers.room("source"), 1996);
    EXPECT_EQ(buffers.text("hour"), "");
}

TEST(ScanInput, CountsTheDirectivesThatItScanned) {
    ParserProbe parser("A,\"%d %*d %d\",month day");
    EXPECT_EQ(parser.scanInput("1 2 3 and more\n"), 3);
    TestBuffers buffers;
    EXPECT_EQ(parser.formatFields(buffers.get()), 2);
    EXPECT_EQ(parser.scanInput("1 2 x\n"), -1);
    EXPECT_EQ(parser.scanInput("4 5 6\n"), 3)
        << "a line that does not match leaves the chain usable";
}

TEST(ScanInput, ALineOfOneCharacterIsBlank) {
    ParserProbe parser("A,\"%c\",type");
    RecordingTrace trace(TRC1_DETAIL);
    TestBuffers buffers;
    for (const char* line : {"\n", "x"}) {
        trace.clear();
        EXPECT_EQ(parser.formatLine(line, buffers.get()), -1);
        EXPECT_THAT(trace.messages(), ElementsAre("This is a blank line."));
    }
    EXPECT_EQ(parser.formatLine("x\n", buffers.get()), 1);
}

TEST(ScanInput, ColumnsAreAbsolute) {
    const std::string line = "abcdefghijklm\n";
    EXPECT_EQ(printed("A,\"%(10)s %(1)s\",type source", line, "type"), "jklm");
    EXPECT_EQ(printed("A,\"%(10)s %(1)s\",type source", line, "source"), "abcdefghijklm");
    EXPECT_EQ(printed("A,\"%(3)2c%2c\",type source", line, "source"), "ef");
    EXPECT_EQ(printed("A,\"%(10)c%(10)c%(10)c\",type type type", line, "type"), "jjj");
    EXPECT_EQ(printed("A,\"%(14)c\",type", line, "type"), "\n");
}

TEST(ScanInput, AColumnBeyondTheLineEndsTheScan) {
    EXPECT_THAT(errorsOf("A,\"%d %(20)s\",day description", "12 short\n"),
                ElementsAre("Error: offset of 20 for column 'description' exceeds string length of "
                            "9. Scan terminated."));
    EXPECT_THAT(errorsOf("A,\"%(10)s\",source", "12 short\n"),
                ElementsAre("Error: offset of 10 for column 'source' exceeds string length of 9. "
                            "Scan terminated."));
    EXPECT_THAT(errorsOf("A,\"%(1)s\",source", ""),
                ElementsAre("Error: offset of 1 for column 'source' exceeds string length of 0. "
                            "Scan terminated."));
    EXPECT_THAT(errorsOf("A,\"%d %(20)*s%d\",day day", "12 short\n"),
                ElementsAre("Error: offset of 20 for column '*' exceeds string length of 9. Scan "
                            "terminated."));
}

TEST(ScanInput, TheEndOfTheLineEndsTheScan) {
    EXPECT_THAT(errorsOf("A,\"%d %d\",month day", "12\n"),
                ElementsAre("Error: end of input found while scanning for variable #2; day. "
                            "Looking for  %d. Scan terminated."));
    EXPECT_THAT(errorsOf("A,\"%d %*d%d\",month day", "12 \n"),
                ElementsAre("Error: end of input found while scanning for variable #2; *. Looking "
                            "for  %*d. Scan terminated."));
    EXPECT_THAT(errorsOf("A,\"%s\",source", ""),
                ElementsAre("Error: end of input found while scanning for variable #1; source. "
                            "Looking for %31s. Scan terminated."));
}

TEST(ScanInput, AMismatchEndsTheScan) {
    EXPECT_THAT(errorsOf("A,\"%d [%d\",month day", "12 (7\n"),
                ElementsAre("Error: scan failed for variable #2; day. Looking for  [%d; found  (7\n"
                            ". Scan terminated."));
    EXPECT_THAT(errorsOf("A,\"%d\",day", "seven\n"),
                ElementsAre("Error: scan failed for variable #1; day. Looking for %d; found "
                            "seven\n. Scan terminated."));
}

TEST(ScanInput, FieldsOfOneKeywordFollowEachOther) {
    EXPECT_EQ(printed("A,\"%s %s\",description description", "one two\n"), "onetwo");
    EXPECT_EQ(printed("A,\"%s %s\",description = \"%s, \" description", "one two\n"), "one, two");
}

TEST(ScanInput, AFullBufferCutsAndThenSkips) {
    ParserProbe parser("A,\"%s %s %s\",source source type");
    TestBuffers buffers(5);
    EXPECT_EQ(parser.formatLine("abc defg hijklmn\n", buffers.get()), 3);
    EXPECT_EQ(buffers.text("source"), "abcde");
    EXPECT_EQ(buffers.room("source"), 0);
    EXPECT_EQ(buffers.text("type"), "hijkl");

    TestBuffers full(3);
    EXPECT_EQ(parser.formatLine("abc defg hi\n", full.get()), 2) << "skipped, not failed";
    EXPECT_EQ(full.text("source"), "abc");
    TestBuffers none(0);
    EXPECT_EQ(parser.formatLine("abc defg hi\n", none.get()), 0);
}

TEST(ScanInput, NothingPastTheRoomIsWritten) {
    ParserProbe parser("A,\"%[^\n]\",description = \"<%s>\"");
    for (const long room : {1L, 2L, 5L, 6L}) {
        std::string memory(10, '#');
        std::array<_FormatBuffer, 11> buffers{};
        buffers[10] = {memory.data(), room};
        EXPECT_EQ(parser.formatLine("abcde\n", buffers.data()), 1);
        EXPECT_EQ(memory, std::string("<abcde>").substr(0, static_cast<std::size_t>(room)) +
                              std::string(10 - static_cast<std::size_t>(room), '#'));
    }
}

TEST(ScanInput, PrintsEveryTypeThroughItsDirective) {
    const char* const cases[][4] = {
        {"%d", "%05d", "-7", "-0007"},
        {"%u", "%u", "-1", "4294967295"},
        {"%o", "%#o", "17", "017"},
        {"%x", "%#X", "ff", "0XFF"},
        {"%i", "%d", "0x10", "16"},
        {"%hd", "%hd", "65535", "-1"},
        {"%hu", "%hu", "65535", "65535"},
        {"%hx", "%hX", "ABCD", "ABCD"},
        {"%ld", "%+ld", "5", "+5"},
        {"%Ld", "%Ld", "-5", "-5"},
        {"%lld", "%12lld", "99", "          99"},
        {"%llu", "%llu", "-1", "18446744073709551615"},
        {"%f", "%5.2f", "3.14159", " 3.14"},
        {"%f", "%f", "0.1", "0.100000"},
        {"%lf", "%.3le", "1234.5", "1.234e+03"},
        {"%Lf", "%.1Lf", "2.25", "2.2"},
        {"%g", "%g", "1e10", "1e+10"},
        {"%s", "%-6s|", "abc", "abc   |"},
        {"%s", "%.2s", "abc", "ab"},
        {"%s", "%c", "abc", "a"},
        {"%c", "<%3c>", "abc", "<  a>"},
        {"%5c", "%s", "abc", "abc\n"},
        {"%d", "constant", "1", "constant"},
        {"%d", "100%%", "1", "100%"},
        {"%d", "100%% %d %%", "1", "100% 1 %"},
        {"%[a-c]", "[%s]", "abcd", "[abc]"},
        {"%d", "%-5d|", "42", "42   |"},
        {"%d", "% d", "42", " 42"},
    };
    for (const auto& [scan, print, text, expected] : cases) {
        EXPECT_EQ(printed("A,\"" + std::string(scan) + "\",description = \"" + print + "\"",
                          std::string(text) + "\n"),
                  expected)
            << scan << ' ' << print;
    }
}

TEST(ScanInput, AnEmptyPrintDirectiveWritesNothing) {
    ParserProbe parser("A,\"%d %d\",day = \"\" month");
    TestBuffers buffers;
    EXPECT_EQ(parser.formatLine("1 2\n", buffers.get()), 1);
    EXPECT_EQ(buffers.text("day"), "");
    EXPECT_EQ(buffers.text("month"), "2");
}

TEST(ScanInput, LongFieldsAreWhole) {
    const std::string text(1023, 'x');
    EXPECT_EQ(printed("A,\"%1023s\",description = \"<%-200s>\"", text + "yz\n"), "<" + text + ">");
    const std::string digits = printed("A,\"%Lf\",description = \"%.0Lf\"", "1e1500\n");
    EXPECT_EQ(digits.size(), 1501U);
}

TEST(ScanInput, NothingOfAnEarlierLineRemains) {
    ParserProbe parser("A,\"%5c\",description");
    TestBuffers first;
    EXPECT_EQ(parser.formatLine("abcdefgh\n", first.get()), 1);
    TestBuffers second;
    EXPECT_EQ(parser.formatLine("x\n", second.get()), 1);
    EXPECT_EQ(second.text("description"), "x\n");
}

TEST(ScanInput, AFieldThatCannotBePrintedFailsTheLine) {
    ParserProbe parser("A,\"%d %d %d\",month day = \"%+d\" year = \"%+d\"");
    RecordingTrace trace(TRC1_ERROR);
    TestBuffers buffers;
    const Fault fault("snprintf", ENOMEM);
    EXPECT_EQ(parser.formatLine("1 2 3\n", buffers.get()), -1);
    EXPECT_THAT(trace.messages(), ElementsAre("Error: print failed for field day."));
    EXPECT_EQ(buffers.text("month"), "1");
    EXPECT_EQ(buffers.text("year"), "");
}

TEST(ScanInput, AFieldWithoutADataTypeIsSkipped) {
    ParserProbe parser("A,\"%d %d\",month day");
    RecordingTrace trace(TRC1_ERROR);
    StringParser* const node = parser.ScanOrder.get();
    node->*(&ParserProbe::DataType) = static_cast<_DataType>(60);
    ASSERT_NE((node->*(&ParserProbe::getPrintDirective))(" = \"constant\""), nullptr);
    TestBuffers buffers;
    EXPECT_EQ(parser.formatLine("1 2\n", buffers.get()), 1);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error: formatting failed for field month; unknown datatype: 60"));
    EXPECT_EQ(buffers.text("day"), "2");
    node->*(&ParserProbe::DataType) = DATATYPE_INT;
}

TEST(ScanInput, LinesThatMatchAreNotTraced) {
    ParserProbe parser("A,\"%(1)d %s\",day description");
    RecordingTrace trace(TRC1_ERROR | TRC1_DETAIL | TRC1_FINE);
    TestBuffers buffers;
    EXPECT_EQ(parser.formatLine("1 text\n", buffers.get()), 2);
    EXPECT_THAT(trace.messages(), IsEmpty());
}

} // namespace
