#include "ParserProbe.h"

#include "support/Faults.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdio>
#include <string>

#include <pthread.h>

using namespace zrm;

// A format as a whole: its beginning, the chain, the dump, the chain's end.

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

TEST(StringParser, LearnsAFormatIntoAChain) {
    const ParserProbe parser("A , \"%d-%d %s\" , month day = \"%02d\" description");
    EXPECT_EQ(parser.status(), OBJECT_FORMAT_LEARNED);
    EXPECT_STREQ(parser.fieldName(), "ANCHOR");
    EXPECT_STREQ(parser.scanDirective(), "");
    EXPECT_STREQ(parser.printDirective(), "");
    EXPECT_EQ(parser.printIndex(), -1);
    const char* const directives[] = {"%d%n", "-%d%n", " %31s%n"};
    const StringParser* node = parser.next();
    for (const char* directive : directives) {
        ASSERT_NE(node, nullptr);
        EXPECT_EQ(node->status(), OBJECT_LEARNED);
        EXPECT_STREQ(node->scanDirective(), directive);
        node = node->next();
    }
    EXPECT_EQ(node, nullptr);
}

TEST(StringParser, BeginsWithTheLetterACommaAndAQuote) {
    for (const char* format : {"A,\"%d\",day", "a,\"%d\",day", " \tA \n, \"%d\",day"}) {
        EXPECT_TRUE(ParserProbe(format).isLearned()) << format;
    }
    for (const char* format : {"", " ", "B,\"%d\",day", "AA,\"%d\",day", "A \"%d\",day", "A,%d,day",
                               "A", "A,", "\"%d\",day", "%s /x/app.log"}) {
        RecordingTrace trace(TRC1_ERROR);
        const ParserProbe parser(format);
        EXPECT_EQ(parser.status(), OBJECT_FAILED);
        EXPECT_EQ(parser.next(), nullptr);
        EXPECT_THAT(trace.messages(),
                    ElementsAre("Scan for start of format specifier failed; looking for \" "
                                "%*1[Aa] , \"%n\" but found:  " +
                                std::string(format)));
    }
    EXPECT_EQ(StringParser(nullptr, testKeywords).status(), OBJECT_FAILED);
}

TEST(StringParser, NeedsADirective) {
    RecordingTrace trace(TRC1_ERROR);
    EXPECT_FALSE(ParserProbe("A,\"no directive\",day").isLearned());
    EXPECT_FALSE(ParserProbe("A,\"\",day").isLearned());
    EXPECT_FALSE(ParserProbe("A,\"100%%\",day").isLearned());
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST(StringParser, NoPartialChainSurvivesALaterFailure) {
    RecordingTrace trace(TRC1_ERROR);
    const ParserProbe parser("A,\"%d %d %d %y\",day day day day");
    EXPECT_EQ(parser.status(), OBJECT_FAILED);
    EXPECT_EQ(parser.next(), nullptr);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Invalid convcode or receiving variable size specified for code y.  "
                            "Directive is  %y"));
}

TEST(StringParser, TheChainConstructorMovesThePosition) {
    const char* const text = "\"%d %s tail\" rest";
    const char* position = text;
    const ParserProbe node(&position);
    EXPECT_EQ(node.status(), OBJECT_LEARNED);
    EXPECT_STREQ(position, "\" rest");
    EXPECT_STREQ(node.next()->scanDirective(), " %31s%n");
    EXPECT_EQ(node.next()->next(), nullptr);

    position = "\"\"";
    EXPECT_EQ(ParserProbe(&position).status(), OBJECT_NO_DIRECTIVE);
    EXPECT_STREQ(position, "\"");

    position = "\"%d %";
    const ParserProbe failed(&position);
    EXPECT_EQ(failed.status(), OBJECT_FAILED) << "a node fails if the next one fails";
    EXPECT_EQ(failed.next(), nullptr);
}

TEST(StringParser, ReportsMemoryThatRunsOutForANode) {
    char expected[64];
    std::snprintf(expected, sizeof expected, "Memory allocation for %d bytes failed.",
                  static_cast<int>(sizeof(StringParser)));
    RecordingTrace trace(TRC1_ERROR);
    {
        const Fault fault("new", ENOMEM);
        EXPECT_FALSE(ParserProbe("A,\"%d\",day").isLearned());
    }
    EXPECT_THAT(trace.messages(), ElementsAre(expected));
    trace.clear();
    {
        const Fault fault("new", ENOMEM, {.skip = 3}); // the first node, its value and directive
        EXPECT_FALSE(ParserProbe("A,\"%d\",day").isLearned());
    }
    EXPECT_THAT(trace.messages(), ElementsAre(expected));
}

std::string dump(const char* name, const StringParser& node, const char* details) {
    char text[512];
    std::snprintf(text, sizeof text, "\n\tFieldName\t\t= %s\n\tthis\t\t\t= %p\n", name,
                  static_cast<const void*>(&node));
    return std::string(text) + details;
}

TEST(StringParser, ALearnedChainIsDumpedInDetail) {
    RecordingTrace trace(TRC1_DETAIL);
    ParserProbe parser("A,\"%(12)3d%*s\",month = \"%5.2d\"");
    const StringParser& first = *parser.node(1);
    const StringParser& second = *parser.node(2);
    char links[3][64];
    std::snprintf(links[0], sizeof links[0], "%p", static_cast<const void*>(&first));
    std::snprintf(links[1], sizeof links[1], "%p", static_cast<const void*>(&second));
    std::snprintf(links[2], sizeof links[2], "%p",
                  static_cast<const void*>((first.*(&ParserProbe::Value)).get()));
    ASSERT_EQ(trace.messages().size(), 3U);
    EXPECT_EQ(trace.messages()[0],
              dump("ANCHOR", parser,
                   (std::string("\tPrintIndex\t\t= -1\n\tScanOrder\t\t= ") + links[0] +
                    "\n\tOffset\t\t\t= 0\n\tMaxFieldSize\t\t= 0\n\tMinFieldSize\t\t= 0\n"
                    "\tPrecision\t\t= 0\n\tScanDirective\t\t= \"\"\n\tPrintDirective\t\t= \"\"\n"
                    "\tDataType\t\t= 0\n\tValue\t\t\t= (nil)\n\tSuppressed\t\t= 0\n"
                    "\tObjectStatus\t\t= 2\n")
                       .c_str()));
    EXPECT_EQ(trace.messages()[1],
              dump("month", first,
                   (std::string("\tPrintIndex\t\t= 1\n\tScanOrder\t\t= ") + links[1] +
                    "\n\tOffset\t\t\t= 11\n\tMaxFieldSize\t\t= 3\n\tMinFieldSize\t\t= 5\n"
                    "\tPrecision\t\t= 2\n\tScanDirective\t\t= \"%3d\"\n"
                    "\tPrintDirective\t\t= \"%5.2d\"\n\tDataType\t\t= 1\n\tValue\t\t\t= " +
                    links[2] + "\n\tSuppressed\t\t= 0\n\tObjectStatus\t\t= 1\n")
                       .c_str()));
    EXPECT_EQ(trace.messages()[2],
              dump("*", second,
                   "\tPrintIndex\t\t= -1\n\tScanOrder\t\t= (nil)\n\tOffset\t\t\t= 0\n"
                   "\tMaxFieldSize\t\t= 0\n\tMinFieldSize\t\t= 0\n\tPrecision\t\t= 0\n"
                   "\tScanDirective\t\t= \"%*s\"\n\tPrintDirective\t\t= \"\"\n\tDataType\t\t= 8\n"
                   "\tValue\t\t\t= (nil)\n\tSuppressed\t\t= 1\n\tObjectStatus\t\t= 1\n"));
}

TEST(StringParser, AFormatThatFailsIsNotDumped) {
    RecordingTrace trace(TRC1_DETAIL);
    const ParserProbe parser("A,\"%d\",nothing");
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST(StringParser, NodesAreDestroyedFromTheLastOne) {
    RecordingTrace trace(0);
    {
        const ParserProbe parser("A,\"%d%*s%s\",day source");
        trace.setLevel(TRC1_FINE);
    }
    EXPECT_THAT(trace.messages(), ElementsAre("source object destroyed.", "* object destroyed.",
                                              "day object destroyed.", "ANCHOR object destroyed."));
}

TEST(StringParser, AValueWithoutADataTypeIsReportedAtTheEnd) {
    RecordingTrace trace(TRC1_ERROR);
    {
        const char* position = "\"%d\"";
        ParserProbe node(&position);
        node.DataType = static_cast<_DataType>(60);
    }
    {
        const char* position = "\"%*d\"";
        ParserProbe node(&position);
        node.DataType = static_cast<_DataType>(61); // no value to delete
    }
    EXPECT_THAT(trace.messages(),
                ElementsAre("Invalid datatype 60 detected.  Unable to delete m_value."));
}

TEST(StringParser, LearnsAsManyDirectivesAsAConfigurationLineHolds) {
    std::string directives;
    std::string fields;
    for (int i = 0; i < 500; ++i) {
        directives += "%*c";
    }
    const ParserProbe parser("A,\"" + directives + "%d\",day");
    EXPECT_TRUE(parser.isLearned());
    EXPECT_NE(parser.node(501), nullptr);
}

/// Runs the work on a thread with a small stack, like the threads of requests.
void onASmallStack(void (*work)()) {
    pthread_attr_t attributes;
    ASSERT_EQ(pthread_attr_init(&attributes), 0);
    ASSERT_EQ(pthread_attr_setstacksize(&attributes, 512 * 1024), 0);
    pthread_t thread;
    const auto start = [](void* argument) -> void* {
        (*static_cast<void (**)()>(argument))();
        return nullptr;
    };
    ASSERT_EQ(pthread_create(&thread, &attributes, start, &work), 0);
    EXPECT_EQ(pthread_join(thread, nullptr), 0);
    pthread_attr_destroy(&attributes);
}

std::string manyDirectives() {
    std::string directives;
    for (int i = 0; i < 20000; ++i) {
        directives += "%*c";
    }
    return directives;
}

TEST(StringParser, TakesNoStackForEachDirective) {
    onASmallStack([] {
        const ParserProbe parser("A,\"" + manyDirectives() + "%d\",day");
        EXPECT_TRUE(parser.isLearned());
        EXPECT_NE(parser.node(20001), nullptr);
    });
}

TEST(StringParser, TakesNoStackForEachDirectiveOfAFormatThatFails) {
    onASmallStack([] {
        const RecordingTrace trace(TRC1_ERROR);
        EXPECT_FALSE(ParserProbe("A,\"" + manyDirectives() + "%y\",day").isLearned());
        EXPECT_FALSE(ParserProbe("A,\"" + manyDirectives() + "%d\",nothing").isLearned());
        EXPECT_EQ(trace.messages().size(), 2U);
    });
}

} // namespace
