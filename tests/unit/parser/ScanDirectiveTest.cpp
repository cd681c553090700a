#include "ParserProbe.h"

#include "support/Faults.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>

using namespace zrm;

// Scan directives: how each is learned, and the message for each that cannot be.

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

/// The format with one directive and, unless the directive is suppressed, one field.
std::string formatOf(const std::string& directive, const std::string& fields = "description") {
    return "A , \"" + directive + "\" , " + fields;
}

/// The error messages of learning the directive. The last one, which names the directive's
/// refusal by the caller, is the user log's and not here.
std::vector<std::string> errorsOf(const std::string& directive) {
    RecordingTrace trace(TRC1_ERROR);
    const ParserProbe parser(formatOf(directive));
    EXPECT_EQ(parser.status(), OBJECT_FAILED) << directive;
    EXPECT_EQ(parser.next(), nullptr) << directive;
    return trace.messages();
}

struct Learned {
    const char* directive;
    const char* scanDirective;
    int dataType;
    unsigned maxFieldSize;
};

class LearnedDirective : public testing::TestWithParam<Learned> {};

TEST_P(LearnedDirective, HasItsTypeWidthAndText) {
    const Learned& expected = GetParam();
    RecordingTrace trace(TRC1_ERROR);
    const ParserProbe parser(formatOf(expected.directive));
    EXPECT_THAT(trace.messages(), IsEmpty());
    ASSERT_TRUE(parser.isLearned()) << expected.directive;
    ASSERT_NE(parser.next(), nullptr);
    EXPECT_STREQ(parser.next()->scanDirective(), expected.scanDirective);
    EXPECT_EQ(parser.next()->dataType(), expected.dataType);
    EXPECT_EQ(parser.next()->maxFieldSize(), expected.maxFieldSize);
    EXPECT_EQ(parser.next()->next(), nullptr);
}

INSTANTIATE_TEST_SUITE_P(
    Types, LearnedDirective,
    testing::Values(Learned{"%d", "%d%n", 1, 0}, Learned{"%i", "%i%n", 1, 0},
                    Learned{"%o", "%o%n", 2, 0}, Learned{"%u", "%u%n", 3, 0},
                    Learned{"%x", "%x%n", 4, 0}, Learned{"%e", "%e%n", 5, 0},
                    Learned{"%f", "%f%n", 6, 0}, Learned{"%g", "%g%n", 7, 0},
                    Learned{"%s", "%31s%n", 8, 31}, Learned{"%c", "%c%n", 9, 1},
                    Learned{"%[a-z]", "%31[a-z]%n", 8, 31}, Learned{"%hd", "%hd%n", 21, 0},
                    Learned{"%hi", "%hi%n", 21, 0}, Learned{"%ho", "%ho%n", 22, 0},
                    Learned{"%hu", "%hu%n", 23, 0}, Learned{"%hx", "%hx%n", 24, 0},
                    Learned{"%ld", "%ld%n", 31, 0}, Learned{"%lo", "%lo%n", 32, 0},
                    Learned{"%lu", "%lu%n", 33, 0}, Learned{"%lx", "%lx%n", 34, 0},
                    Learned{"%le", "%le%n", 35, 0}, Learned{"%lf", "%lf%n", 36, 0},
                    Learned{"%lg", "%lg%n", 37, 0}, Learned{"%Ld", "%Ld%n", 41, 0},
                    Learned{"%Lo", "%Lo%n", 42, 0}, Learned{"%Lu", "%Lu%n", 43, 0},
                    Learned{"%Lx", "%Lx%n", 44, 0}, Learned{"%Le", "%Le%n", 45, 0},
                    Learned{"%Lf", "%Lf%n", 46, 0}, Learned{"%Lg", "%Lg%n", 47, 0},
                    Learned{"%lld", "%lld%n", 51, 0}, Learned{"%llo", "%llo%n", 52, 0},
                    Learned{"%llu", "%llu%n", 53, 0}, Learned{"%llx", "%llx%n", 54, 0}));

INSTANTIATE_TEST_SUITE_P(
    Widths, LearnedDirective,
    testing::Values(Learned{"%5c", "%5c%n", 8, 5}, Learned{"%1c", "%1c%n", 9, 1},
                    Learned{"%2c", "%2c%n", 8, 2}, Learned{"%00012d", "%12d%n", 1, 12},
                    Learned{"%1023s", "%1023s%n", 8, 1023}, Learned{"%7[^ ]", "%7[^ ]%n", 8, 7}));

INSTANTIATE_TEST_SUITE_P(
    Literals, LearnedDirective,
    testing::Values(Learned{"[%d", "[%d%n", 1, 0}, Learned{"a b: %d", "a b: %d%n", 1, 0},
                    Learned{"100%%%d", "100%%%d%n", 1, 0}, Learned{"%d tail", "%d%n", 1, 0},
                    Learned{R"(\"\'\?\\\a\b\n\r\t\v%d)", "\"'?\\\a\b\n\r\t\v%d%n", 1, 0},
                    Learned{R"(%[^\"\\])", "%31[^\"\\]%n", 8, 31},
                    Learned{"%[]a]", "%31[]a]%n", 8, 31}, Learned{"%[^]a]", "%31[^]a]%n", 8, 31},
                    Learned{"%[^^]", "%31[^^]%n", 8, 31},
                    Learned{R"(%[\t^])", "%31[\t^]%n", 8, 31}));

TEST(ScanDirective, SuppressedOnesNeedNoFieldNameAndHaveNoStorage) {
    ParserProbe parser(formatOf("%*d %*5s%*[a-z]%*s%s", "description"));
    ASSERT_TRUE(parser.isLearned());
    const char* const texts[] = {"%*d%n", " %*5s%n", "%*[a-z]%n", "%*s%n"};
    int number = 1;
    for (const char* text : texts) {
        const StringParser* node = parser.node(number++);
        ASSERT_NE(node, nullptr);
        EXPECT_STREQ(node->scanDirective(), text) << "no width is inserted if nothing is stored";
        EXPECT_TRUE(node->isSuppressed());
        EXPECT_STREQ(node->fieldName(), "*");
        EXPECT_STREQ(node->printDirective(), "");
        EXPECT_EQ(node->printIndex(), -1);
    }
    EXPECT_STREQ(parser.node(5)->fieldName(), "description");
    EXPECT_TRUE(ParserProbe("a,\"%*d\",").isLearned());
}

TEST(ScanDirective, ColumnsAreStoredFromZeroAndOmittedFromTheDirective) {
    const ParserProbe parser(formatOf("%(10)s %(1)5c%(999)*d%d", "source type day"));
    ASSERT_TRUE(parser.isLearned());
    EXPECT_EQ(parser.node(1)->offset(), 9U);
    EXPECT_STREQ(parser.node(1)->scanDirective(), "%31s%n");
    EXPECT_EQ(parser.node(2)->offset(), 0U);
    EXPECT_STREQ(parser.node(2)->scanDirective(), " %5c%n");
    EXPECT_EQ(parser.node(3)->offset(), 998U);
    EXPECT_STREQ(parser.node(3)->scanDirective(), "%*d%n");
    EXPECT_EQ(parser.node(4)->offset(), 0U);
}

TEST(ScanDirective, RefusesColumnsByValueAndByLength) {
    EXPECT_THAT(errorsOf("%(0)d"), ElementsAre("Invalid column position specified: 0); ZERO < "
                                               "column <= 1023."));
    EXPECT_THAT(errorsOf("%(1000)d"), ElementsAre("Invalid column position specified: 1000); ZERO "
                                                  "< column <= 1023."));
    EXPECT_THAT(errorsOf("%(0007)d"), ElementsAre("Invalid column position specified: 0007); ZERO "
                                                  "< column <= 1023."));
    EXPECT_THAT(errorsOf("%(-5)d"), ElementsAre("Invalid column position specified: -5); ZERO < "
                                                "column <= 1023."));
    EXPECT_THAT(errorsOf("%(x)d"), ElementsAre("Invalid column position syntax; expected "
                                               "'(column)'; found (x)d\" , description"));
    EXPECT_THAT(errorsOf("%(12d"), ElementsAre("Invalid column position syntax; expected "
                                               "'(column)'; found (12d\" , description"));
    EXPECT_THAT(errorsOf("%()d"), ElementsAre("Invalid column position syntax; expected "
                                              "'(column)'; found ()d\" , description"));
}

TEST(ScanDirective, RefusesWidthsByValueAndByLength) {
    EXPECT_THAT(errorsOf("%1024d"),
                ElementsAre("Invalid field width specified: 1024; ZERO < width <= 1023."));
    EXPECT_THAT(errorsOf("%0d"),
                ElementsAre("Invalid field width specified: 0; ZERO < width <= 1023."));
    EXPECT_THAT(errorsOf("%10000s"),
                ElementsAre("Invalid field width specified: 10000; ZERO < width <= 1023."));
    EXPECT_THAT(errorsOf("%4294967297d"), // 1 in 32 bits
                ElementsAre("Invalid field width specified: 4294967297; ZERO < width <= 1023."));
    EXPECT_THAT(errorsOf("%99999999999999999999d"),
                ElementsAre("Invalid field width specified: 99999999999999999999; ZERO < width <= "
                            "1023."));
}

TEST(ScanDirective, RefusesCodesAndSizesThatDoNotCombine) {
    const char* const refused[][2] = {
        {"%hs", "s"},  {"%lc", "c"},  {"%he", "e"}, {"%lle", "e"}, {"%X", "X"},
        {"%E", "E"},   {"%G", "G"},   {"%y", "y"},  {"%ls", "s"},  {"%Lc", "c"},
        {"%llf", "f"}, {"%hg", "g"},  {"%l[", "["}, {"%p", "p"},   {"%n", "n"},
        {"%Lld", "l"}, {"%lLd", "L"}, {"%F", "F"},  {"% d", " "},
    };
    for (const auto& [directive, code] : refused) {
        const std::string text(directive);
        const std::size_t end = text.find(code, 1) + 1;
        EXPECT_THAT(errorsOf(directive),
                    ElementsAre("Invalid convcode or receiving variable size specified for code " +
                                std::string(code) + ".  Directive is " + text.substr(0, end)))
            << directive;
    }
    EXPECT_THAT(errorsOf("%hhd"), ElementsAre("Invalid convcode or receiving variable size "
                                              "specified for code h.  Directive is %hh"));
}

TEST(ScanDirective, RefusesScanSetsWithoutAnEnd) {
    EXPECT_THAT(errorsOf("%[a-z"), ElementsAre("Invalid convcode or receiving variable size "
                                               "specified for code [.  Directive is %[a-z"));
    EXPECT_THAT(errorsOf("%[]"),
                ElementsAre("Invalid convcode or receiving variable size specified "
                            "for code [.  Directive is %[]"));
    EXPECT_THAT(errorsOf("%[^]"), ElementsAre("Invalid convcode or receiving variable size "
                                              "specified for code [.  Directive is %[^]"));
    RecordingTrace trace(TRC1_ERROR);
    EXPECT_EQ(ParserProbe("A,\"%[abc").status(), OBJECT_FAILED);
    EXPECT_EQ(ParserProbe("A,\"%[abc\\").status(), OBJECT_FAILED);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Invalid convcode or receiving variable size specified for code [.  "
                            "Directive is %[abc",
                            "Invalid convcode or receiving variable size specified for code [.  "
                            "Directive is %[abc\\"));
}

TEST(ScanDirective, RefusesUnknownEscapes) {
    EXPECT_THAT(errorsOf("\\f%d"), ElementsAre("Invalid escape sequence found : '\\f'"));
    EXPECT_THAT(errorsOf("\\0%d"), ElementsAre("Invalid escape sequence found : '\\0'"));
    EXPECT_THAT(errorsOf("%d \\x41%d"), ElementsAre("Invalid escape sequence found : '\\x'"));
    EXPECT_THAT(errorsOf("%[\\]]"), ElementsAre("Invalid escape sequence found : '\\]'"));
}

TEST(ScanDirective, EndOfTheTextWithinADirective) {
    RecordingTrace trace(TRC1_ERROR);
    EXPECT_EQ(ParserProbe("A,\"%").status(), OBJECT_FAILED);
    EXPECT_EQ(ParserProbe("A,\"%l").status(), OBJECT_FAILED);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Invalid convcode or receiving variable size specified for code  .  "
                            "Directive is %",
                            "Invalid convcode or receiving variable size specified for code  .  "
                            "Directive is %l"));
    trace.clear();
    EXPECT_EQ(ParserProbe("A,\"%d").status(), OBJECT_FAILED);
    EXPECT_EQ(ParserProbe("A,\"abc").status(), OBJECT_FAILED);
    EXPECT_EQ(ParserProbe("A,\"abc\\").status(), OBJECT_FAILED);
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST(ScanDirective, ADatatypeOutsideTheTableIsAFault) {
    const char* position = "\"%d\"";
    ParserProbe node(&position);
    RecordingTrace trace(TRC1_ERROR);
    _BuildArea area("d\"");
    area.append("%d", 2);
    node.DataType = static_cast<_DataType>(60);
    EXPECT_EQ(node.validateScanConvcode(&area), -1);
    EXPECT_THAT(trace.messages(), ElementsAre("Invalid datatype of 61 computed; directive is %d"));
    node.DataType = DATATYPE_INT;
}

// The build area: 255 characters, of which "%n" needs two.

std::string ofLength(std::size_t length, const std::string& conversion) {
    return std::string(length - conversion.size(), 'x') + conversion;
}

TEST(ScanDirective, FillsTheBuildAreaUpTo255Characters) {
    const ParserProbe whole(formatOf(ofLength(253, "%d")));
    ASSERT_TRUE(whole.isLearned());
    EXPECT_EQ(whole.next()->scanDirective(), ofLength(253, "%d") + "%n");
    // Without room for its count the directive is learned and matches nothing.
    for (const std::size_t length : {254U, 255U}) {
        ParserProbe countless(formatOf(ofLength(length, "%d")));
        ASSERT_TRUE(countless.isLearned()) << length;
        EXPECT_EQ(countless.next()->scanDirective(), ofLength(length, "%d"));
        EXPECT_EQ(countless.scanInput((std::string(length - 2, 'x') + "1\n").c_str()), -1);
    }
    EXPECT_THAT(errorsOf(ofLength(256, "%d")),
                ElementsAre("Invalid convcode or receiving variable size specified for code d.  "
                            "Directive is " +
                            ofLength(255, "%")));
    EXPECT_THAT(errorsOf(ofLength(257, "%d")), IsEmpty());
    EXPECT_THAT(errorsOf(ofLength(257, "%12d")), IsEmpty());
    EXPECT_THAT(errorsOf(ofLength(256, "%*d")), ElementsAre(HasSubstr("for code d.")));
    EXPECT_THAT(errorsOf(ofLength(256, "%%d")), IsEmpty());
}

TEST(ScanDirective, TheDefaultWidthAppliesEvenWithoutRoomForItsText) {
    const ParserProbe roomy(formatOf(ofLength(251, "%s")));
    ASSERT_TRUE(roomy.isLearned());
    EXPECT_EQ(roomy.next()->scanDirective(), ofLength(253, "%31s") + "%n");
    ParserProbe full(formatOf(ofLength(252, "%s")));
    ASSERT_TRUE(full.isLearned());
    EXPECT_EQ(full.next()->scanDirective(), ofLength(252, "%s") + "%n");
    EXPECT_EQ(full.next()->maxFieldSize(), 31U);
    const std::string line = std::string(250, 'x') + std::string(100, 'y') + "\n";
    TestBuffers buffers;
    EXPECT_EQ(full.formatLine(line.c_str(), buffers.get()), 1);
    EXPECT_EQ(buffers.text("description"), std::string(31, 'y'));
}

TEST(ScanDirective, StoragesAreAllocatedWithTheirSizes) {
    const struct {
        const char* directive;
        int bytes;
    } storages[] = {{"%d", 4},   {"%hd", 2},       {"%ld", 8}, {"%Ld", 8}, {"%llx", 8},
                    {"%f", 4},   {"%lf", 8},       {"%c", 1},  {"%s", 32}, {"%5c", 6},
                    {"%Lg", 16}, {"%1023s", 1024}, {"%1c", 1}, {"%o", 4},  {"%9[a]", 10}};
    for (const auto& [directive, bytes] : storages) {
        if (std::string(directive) == "%Lg" && sizeof(long double) != 16) {
            continue;
        }
        const Fault fault("new", ENOMEM, {.skip = 1}); // the node itself is allocated first
        EXPECT_THAT(errorsOf(directive),
                    ElementsAre("Memory allocation failed for " + std::to_string(bytes) +
                                " bytes; errno = 12; Cannot allocate memory"))
            << directive;
    }
}

TEST(ScanDirective, ReportsMemoryThatRunsOutForTheDirectivesText) {
    const Fault fault("new", ENOMEM, {.skip = 2});
    EXPECT_THAT(errorsOf("abc%d"), ElementsAre("Memory allocation failed for 8 bytes; errno = 12; "
                                               "Cannot allocate memory"));
}

} // namespace
