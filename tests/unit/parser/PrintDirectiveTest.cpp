#include "ParserProbe.h"

#include "support/Faults.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdint>

using namespace zrm;

// Print directives: how each is learned, and the message for each warning and refusal.

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

std::string formatOf(const std::string& scan, const std::string& print) {
    return "a,\"" + scan + "\",day = \"" + print + "\"";
}

/// Two refusals: that of the print directive and then that of the field.
std::vector<std::string> errorsOf(const std::string& scan, const std::string& print) {
    RecordingTrace trace(TRC1_ERROR);
    const ParserProbe parser(formatOf(scan, print));
    EXPECT_EQ(parser.status(), OBJECT_FAILED) << print;
    std::vector<std::string> messages = trace.messages();
    if (!messages.empty()) {
        std::string text = scan;
        if (scan == "%s") {
            text = "%31s";
        }
        EXPECT_EQ(messages.back(), "Error while processing directive #1; " + text + ".");
        messages.pop_back();
    }
    return messages;
}

/// The learned directive, or "refused", and the warnings.
std::pair<std::string, std::vector<std::string>> learned(const std::string& scan,
                                                         const std::string& print) {
    RecordingTrace trace(TRC1_ERROR);
    const ParserProbe parser(formatOf(scan, print));
    EXPECT_THAT(trace.messages(), IsEmpty()) << "warnings are of the detail class";
    trace.clear();
    trace.setLevel(TRC1_DETAIL);
    const ParserProbe again(formatOf(scan, print));
    std::vector<std::string> warnings;
    for (const std::string& message : trace.messages()) {
        if (message.rfind("Warning", 0) == 0) {
            warnings.push_back(message);
        }
    }
    return {parser.isLearned() ? parser.next()->printDirective() : "refused", warnings};
}

std::string directive(const std::string& scan, const std::string& print) {
    const auto [text, warnings] = learned(scan, print);
    EXPECT_THAT(warnings, IsEmpty());
    return text;
}

TEST(PrintDirective, IsTheTypesDefaultWhenNoneIsGiven) {
    const char* const codes[] = {"d",  "o",  "u",  "x",   "e",   "f",   "g",  "s",
                                 "c",  "hd", "ho", "hu",  "hx",  "ld",  "lo", "lu",
                                 "lx", "le", "lf", "lg",  "Ld",  "Lo",  "Lu", "Lx",
                                 "Le", "Lf", "Lg", "lld", "llo", "llu", "llx"};
    for (const char* code : codes) {
        const ParserProbe parser("A,\"%" + std::string(code) + "\",day");
        ASSERT_TRUE(parser.isLearned()) << code;
        EXPECT_EQ(parser.next()->printDirective(), "%" + std::string(code));
        EXPECT_STREQ(StringParser::convertType2Char(parser.next()->dataType()),
                     parser.next()->printDirective());
    }
    EXPECT_STREQ(ParserProbe("A,\"%i\",day").next()->printDirective(), "%d");
    EXPECT_STREQ(ParserProbe("A,\"%5c\",day").next()->printDirective(), "%s");
    EXPECT_STREQ(StringParser::convertType2Char(static_cast<_DataType>(38)), "");
}

TEST(PrintDirective, TheTextOfATypeIsTheResultOfAnOperation) {
    const RecordingTrace trace(TRC1_FLOW);
    const char* const text = StringParser::convertType2Char(DATATYPE_LONGx);
    EXPECT_THAT(trace.events(),
                ElementsAre("StringParser.cpp entry",
                            "StringParser.cpp exit " +
                                std::to_string(reinterpret_cast<std::intptr_t>(text))));
}

TEST(PrintDirective, KeepsTextConversionAndText) {
    EXPECT_EQ(directive("%d", "%02d"), "%02d");
    EXPECT_EQ(directive("%d", "day %5d!"), "day %5d!");
    EXPECT_EQ(directive("%d", "100%% %x %%"), "100%% %x %%");
    EXPECT_EQ(directive("%s", R"(\"%-8.3s\"\t)"), "\"%-8.3s\"\t");
    EXPECT_EQ(directive("%d", "%X"), "%X");
    EXPECT_EQ(directive("%e", "%G"), "%G");
    EXPECT_EQ(directive("%f", "%E"), "%E");
    EXPECT_EQ(directive("%hd", "%hi"), "%hi");
    EXPECT_EQ(directive("%d", "constant"), "constant");
    EXPECT_EQ(directive("%d", ""), "");
}

TEST(PrintDirective, IsIntroducedByAnEqualsSignAndAQuote) {
    EXPECT_TRUE(ParserProbe("A,\"%d\",day \t=\n \"%d\"  ").isLearned());
    EXPECT_TRUE(ParserProbe("A,\"%d\",day=\"%d\"").isLearned());
    RecordingTrace trace(TRC1_ERROR);
    EXPECT_FALSE(ParserProbe("A,\"%d\",day = %d").isLearned());
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error in print directive for field day. Expected \"= \"\"; found \"= "
                            "%d\"",
                            "Error while processing directive #1; %d."));
}

TEST(PrintDirective, HasAnEnd) {
    EXPECT_THAT(errorsOf("%d", "%d\\"), IsEmpty()); // the closing quote is escaped
    RecordingTrace trace(TRC1_ERROR);
    for (const char* text : {"\"", "\"text", "\"%d", "\"%-", "\"%-5.", "\"text\\"}) {
        trace.clear();
        EXPECT_FALSE(ParserProbe(std::string("A,\"%d\",day = ") + text).isLearned()) << text;
        EXPECT_EQ(trace.messages().back(), "Error while processing directive #1; %d.") << text;
    }
}

TEST(PrintDirective, ReadsMinimumWidths) {
    EXPECT_EQ(directive("%s", "%256s"), "%256s");
    EXPECT_EQ(directive("%d", "%007d"), "%07d") << "a zero given twice is dropped once";
    const ParserProbe parser(formatOf("%d", "%17d"));
    EXPECT_EQ(parser.next()->minFieldSize(), 17U);
    EXPECT_THAT(
        errorsOf("%s", "%257s"),
        ElementsAre("Invalid minimum field width specified: 257; ZERO < min width <= 256."));
    EXPECT_THAT(errorsOf("%s", "%1000s"),
                ElementsAre("Invalid minimum field width specified: 1000; ZERO < min width <= "
                            "256."));
}

TEST(PrintDirective, ReadsPrecisions) {
    EXPECT_EQ(directive("%f", "%.99f"), "%.99f");
    EXPECT_EQ(directive("%f", "%.f"), "%.f");
    EXPECT_EQ(directive("%f", "%8.3f"), "%8.3f");
    EXPECT_EQ(ParserProbe(formatOf("%f", "%8.3f")).next()->precision(), 3U);
    EXPECT_EQ(ParserProbe(formatOf("%f", "%.f")).next()->precision(), 0U);
    EXPECT_THAT(errorsOf("%f", "%.100f"),
                ElementsAre("Invalid precision specified for field day: .100f\"; ZERO <= precision "
                            "<= 256."));
    EXPECT_THAT(errorsOf("%f", "%.-5f"),
                ElementsAre("Invalid precision specified for field day: .-5f\"; ZERO <= precision "
                            "<= 256."));
    EXPECT_THAT(errorsOf("%f", "%.+5f"),
                ElementsAre("Invalid precision specified for field day: .+5f\"; ZERO <= precision "
                            "<= 256."));
}

TEST(PrintDirective, RefusesCodesAndSizesThatDoNotCombine) {
    const char* const refused[][2] = {
        {"%hs", "%hs"}, {"%lc", "%lc"},  {"%hf", "%hf"},  {"%llg", "%llg"}, {"%[a]", "%["},
        {"%y", "%y"},   {"%5 d", "%5 "}, {"%hhd", "%hh"}, {"%p", "%p"},     {"%F", "%F"},
    };
    for (const auto& [print, read] : refused) {
        EXPECT_THAT(errorsOf("%d", print),
                    ElementsAre("Invalid convcode or variable size specified in print directive "
                                "for field day. Directive is " +
                                std::string(read)))
            << print;
    }
}

TEST(PrintDirective, PairsWithTheScanTypesOfItsGroup) {
    const char* const pairs[][2] = {{"%d", "%u"},   {"%x", "%d"},     {"%e", "%f"},
                                    {"%g", "%E"},   {"%s", "%s"},     {"%hx", "%hd"},
                                    {"%lu", "%lX"}, {"%le", "%lG"},   {"%Ld", "%Lx"},
                                    {"%Lf", "%Le"}, {"%llo", "%lld"}, {"%c", "%c"}};
    for (const auto& [scan, print] : pairs) {
        EXPECT_EQ(directive(scan, print), print);
    }
    const char* const strangers[][4] = {
        {"%s", "%d", "%s", "%d"},       {"%d", "%s", "%d", "%s"},     {"%d", "%ld", "%d", "%ld"},
        {"%ld", "%lld", "%ld", "%lld"}, {"%Ld", "%ld", "%Ld", "%ld"}, {"%f", "%lf", "%f", "%lf"},
        {"%c", "%s", "%c", "%s"},       {"%d", "%c", "%d", "%c"},     {"%x", "%hX", "%x", "%hx"},
        {"%lf", "%LE", "%lf", "%Le"},
    };
    for (const auto& [scan, print, scanType, printType] : strangers) {
        EXPECT_THAT(errorsOf(scan, print),
                    ElementsAre("Scan and print data types are not compatible for field day. Scan "
                                "type is " +
                                std::string(scanType) + "; print type is " + printType + "."));
    }
}

TEST(PrintDirective, TheFirstCharacterOfATextMakesItACharacter) {
    const ParserProbe parser(formatOf("%s", "%c"));
    ASSERT_TRUE(parser.isLearned());
    EXPECT_EQ(parser.next()->dataType(), DATATYPE_CHAR);
    EXPECT_EQ(parser.next()->maxFieldSize(), 31U);
}

TEST(PrintDirective, HoldsOneConversion) {
    EXPECT_THAT(errorsOf("%d", "%d and %d"),
                ElementsAre("Error: multiple format specifiers found in print directive for field "
                            "day."));
}

TEST(PrintDirective, ADatatypeOutsideAllGroupsIsAFault) {
    const char* position = "\"%d\"";
    ParserProbe node(&position);
    RecordingTrace trace(TRC1_ERROR);
    _BuildArea area("d");
    area.append("%d", 2);
    EXPECT_EQ(node.validatePrintConvcode(&area, static_cast<_DataType>(60)), -1);
    EXPECT_THAT(trace.messages(), ElementsAre("Invalid datatype of 61 computed from directive for "
                                              "field . Directive is %d"));
}

// Options.

std::string refusedOption(char option, const std::string& type, const std::string& rest) {
    return "Warning: cannot use '" + std::string(1, option) +
           "' option character in the print directive for field day which has a scan data type of "
           "\"" +
           type + "\". Print directive is \"" + rest + "\".";
}

TEST(PrintOptions, AreKeptWhereTheTypeAllowsThem) {
    for (const char* code : {"d", "f", "g", "hd", "ld", "lf", "lg", "Ld", "Lf", "Lg", "lld"}) {
        const std::string print = "%'+#0" + std::string(code);
        EXPECT_EQ(directive("%" + std::string(code), print), print);
        EXPECT_EQ(directive("%" + std::string(code), "% " + std::string(code)),
                  "% " + std::string(code));
    }
    for (const char* code : {"u", "hu", "lu", "Lu", "llu"}) {
        const std::string print = "%'-#" + std::string(code);
        EXPECT_EQ(directive("%" + std::string(code), print), print);
    }
    for (const char* code : {"e", "le", "Le"}) {
        const std::string print = "%+-#" + std::string(code);
        EXPECT_EQ(directive("%" + std::string(code), print), print);
    }
    EXPECT_EQ(directive("%s", "%-5s"), "%-5s");
    EXPECT_EQ(directive("%c", "%-5c"), "%-5c");
}

TEST(PrintOptions, AreDroppedWhereTheTypeRefusesThem) {
    using Result = std::pair<std::string, std::vector<std::string>>;
    for (const char* code : {"u", "o", "x", "hu", "lo", "Lx", "llu", "s", "c"}) {
        const std::string type = "%" + std::string(code);
        for (const char option : {'+', ' '}) {
            const std::string rest = option + std::string(code) + "\"";
            EXPECT_EQ(learned(type, "%" + (option + std::string(code))),
                      (Result{type, {refusedOption(option, type, rest)}}));
        }
    }
    for (const char* code : {"o", "x", "e", "ho", "hx", "lo", "le", "Le", "llx", "s", "c"}) {
        const std::string type = "%" + std::string(code);
        EXPECT_EQ(learned(type, "%'" + std::string(code)),
                  (Result{type,
                          {"Warning: cannot use ''' option character in the print directive for "
                           "field day  which has a scan data type of \"" +
                           type + "\". Print directive is \"'" + code + "\"\"."}}));
    }
    for (const char* code : {"s", "c"}) {
        const std::string type = "%" + std::string(code);
        EXPECT_EQ(learned(type, "%#" + std::string(code)),
                  (Result{type, {refusedOption('#', type, "#" + std::string(code) + "\"")}}));
        EXPECT_EQ(learned(type, "%05" + std::string(code)),
                  (Result{"%5" + std::string(code),
                          {"Warning: cannot use zero padding in the print directive for field day "
                           "which has a scan data type of \"" +
                           type + "\". Print directive is \"05" + code + "\"\"."}}));
    }
}

constexpr char leftOverZero[] =
    "Warning: left justification overrides zero padding in print directive for field day.";

TEST(PrintOptions, LeftJustificationOverridesZeroPadding) {
    EXPECT_EQ(learned("%d", "%-05d").first, "%-5d");
    EXPECT_THAT(learned("%d", "%-05d").second, ElementsAre(leftOverZero));
    EXPECT_EQ(learned("%d", "%0-5d").first, "%0-5d");
    EXPECT_THAT(learned("%d", "%0-5d").second, ElementsAre(leftOverZero));
    EXPECT_EQ(learned("%d", "%0--5d").first, "%0-5d");
    EXPECT_THAT(learned("%d", "%0--5d").second, ElementsAre(leftOverZero));
}

TEST(PrintOptions, SignOverridesBlank) {
    EXPECT_EQ(learned("%d", "%+ d").first, "%+d");
    EXPECT_THAT(learned("%d", "%+ d").second,
                ElementsAre("Warning: '+' option overrides ' ' option in print directive for field "
                            "day."));
    EXPECT_EQ(learned("%d", "% +d").first, "% +d");
    EXPECT_THAT(learned("%d", "% +d").second,
                ElementsAre("Warning: '+' option overrides ' 'option in print directive for field "
                            "day."));
    EXPECT_EQ(learned("%u", "%+ u").first, "%u") << "a refused '+' does not count";
    EXPECT_THAT(learned("%u", "%+ u").second,
                ElementsAre(refusedOption('+', "%u", "+ u\""), refusedOption(' ', "%u", " u\"")));
}

TEST(PrintOptions, GivenTwiceAreDroppedSilently) {
    EXPECT_EQ(directive("%d", "%++d"), "%+d");
    EXPECT_EQ(directive("%d", "%  d"), "% d");
    EXPECT_EQ(directive("%d", "%--d"), "%-d");
    EXPECT_EQ(directive("%d", "%##d"), "%#d");
    EXPECT_EQ(directive("%d", "%''d"), "%'d");
    EXPECT_EQ(directive("%d", "%00d"), "%0d");
}

TEST(PrintOptions, GroupingTracesTheLocalesSeparator) {
    RecordingTrace trace(TRC1_FINE);
    const ParserProbe parser(formatOf("%d", "%'d"));
    EXPECT_EQ(trace.count("Integer \"thousands_sep\" is ' '."), 1) << "the \"C\" locale has none";
}

// The build area.

TEST(PrintDirective, FillsTheBuildAreaUpTo255Characters) {
    // The closing quote occupies one character while it is read.
    const std::string text(254, 'x');
    EXPECT_EQ(directive("%d", text), text);
    EXPECT_THAT(errorsOf("%d", text + "x"), IsEmpty());
    const std::string conversion = std::string(252, 'x') + "%d";
    EXPECT_EQ(directive("%d", conversion), conversion);
    EXPECT_THAT(errorsOf("%d", std::string(253, 'x') + "%d"), IsEmpty());
    EXPECT_THAT(errorsOf("%d", std::string(254, 'x') + "%d"),
                ElementsAre("Invalid convcode or variable size specified in print directive for "
                            "field day. Directive is " +
                            std::string(254, 'x') + "%"));
    for (const char* ending : {"%-5d", "%5d", "%.2d"}) {
        EXPECT_FALSE(ParserProbe(formatOf("%d", std::string(254, 'x') + ending)).isLearned());
    }
}

TEST(PrintDirective, ReportsMemoryThatRunsOut) {
    const Fault fault("new", ENOMEM, {.skip = 4}); // two nodes, a value, a scan directive
    EXPECT_THAT(errorsOf("%d", "%02d"), ElementsAre("Memory allocation failed for 5 bytes; errno = "
                                                    "12; Cannot allocate memory"));
}

} // namespace
