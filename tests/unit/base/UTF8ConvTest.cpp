#include "base/UTF8Conv.h"

#include "framework/trace.h"
#include "support/LocaleDouble.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>
#include <vector>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::ExitedWithCode;

class UTF8ConvTest : public testing::Test {
protected:
    UTF8ConvTest() { LocaleDouble::reset(); }
    ~UTF8ConvTest() override { LocaleDouble::reset(); }

    char out[32] = "untouched";
};

TEST_F(UTF8ConvTest, ConvertsFromTheLocalCodePageWithTheCallersFlags) {
    EXPECT_EQ(UTF8Conv::Convert_toUTF8(out, sizeof out, "gr\xFC\xDFxx", 4, 0), 6);
    EXPECT_STREQ(out, "gr\xC3\xBC\xC3\x9F");
    EXPECT_EQ(UTF8Conv::Convert_toUTF8(out, 9, "abc", 3, LOC2_NO_TERMINATOR), 3);
    EXPECT_EQ(std::string(out, 6), "abc\xBC\xC3\x9F");

    const auto translations = LocaleDouble::translations();
    ASSERT_EQ(translations.size(), 2U);
    EXPECT_EQ(translations[0].targetCodePage, LOC2_UTF8);
    EXPECT_EQ(translations[0].sourceCodePage, LocaleDouble::latin1Page);
    EXPECT_EQ(translations[0].targetSize, sizeof out);
    EXPECT_EQ(translations[0].source, "gr\xFC\xDF");
    EXPECT_EQ(translations[0].flags, 0);
    EXPECT_EQ(translations[1].targetSize, 9U);
    EXPECT_EQ(translations[1].flags, LOC2_NO_TERMINATOR);
}

TEST_F(UTF8ConvTest, ConvertsToTheLocalCodePageWithATerminator) {
    EXPECT_EQ(UTF8Conv::Convert_fromUTF8(out, 7, "gr\xC3\xBC\xC3\x9Fxx", 6), 4);
    EXPECT_STREQ(out, "gr\xFC\xDF");

    const auto translations = LocaleDouble::translations();
    ASSERT_EQ(translations.size(), 1U);
    EXPECT_EQ(translations[0].targetCodePage, LocaleDouble::latin1Page);
    EXPECT_EQ(translations[0].sourceCodePage, LOC2_UTF8);
    EXPECT_EQ(translations[0].targetSize, 7U);
    EXPECT_EQ(translations[0].source, "gr\xC3\xBC\xC3\x9F");
    EXPECT_EQ(translations[0].flags, 0);
}

TEST_F(UTF8ConvTest, AsciiStaysAsItIsInBothDirections) {
    const std::string name = "/var/adm/messages";
    EXPECT_EQ(UTF8Conv::Convert_toUTF8(out, sizeof out, name.c_str(), name.size(), 0), 17);
    EXPECT_EQ(out, name);
    EXPECT_EQ(UTF8Conv::Convert_fromUTF8(out, sizeof out, name.c_str(), name.size()), 17);
    EXPECT_EQ(out, name);
}

TEST_F(UTF8ConvTest, TracesSizesAndCountsInTheDetailClass) {
    RecordingTrace trace(TRC1_DETAIL);
    UTF8Conv::Convert_toUTF8(out, sizeof out, "abc", 3, 0);
    EXPECT_THAT(trace.messages(), ElementsAre("bytesCopied = 3"));
    trace.clear();
    UTF8Conv::Convert_fromUTF8(out, sizeof out, "abcd", 4);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Convert_from UTF8 reslen=32 srclen=4", "bytesCopied = 4"));
}

TEST_F(UTF8ConvTest, TracesNothingOfASuccessInTheOtherClasses) {
    RecordingTrace trace(TRC1_ERROR | TRC1_FINE | TRC1_FLOW);
    UTF8Conv::Convert_toUTF8(out, sizeof out, "abc", 3, 0);
    UTF8Conv::Convert_fromUTF8(out, sizeof out, "abc", 3);
    EXPECT_THAT(trace.messages(), ElementsAre());
    EXPECT_THAT(trace.events(), ElementsAre("UTF8Conv.cpp entry", "UTF8Conv.cpp exit 3",
                                            "UTF8Conv.cpp entry", "UTF8Conv.cpp exit 3"));
}

TEST_F(UTF8ConvTest, WithoutACodePageEachCallReportsItAndConvertsNothing) {
    LocaleDouble::setCodePage(0);
    RecordingTrace trace(0);
    for (int i = 0; i < 2; ++i) {
        EXPECT_EQ(UTF8Conv::Convert_toUTF8(out, sizeof out, "abc", 3, 0), 0);
        EXPECT_EQ(UTF8Conv::Convert_fromUTF8(out, sizeof out, "abc", 3), 0);
    }
    EXPECT_STREQ(out, "untouched");
    EXPECT_THAT(trace.messages(), ElementsAre("Codepage returned was 0; not a valid codepage.",
                                              "Codepage return was 0; Not a valid codepage.",
                                              "Codepage returned was 0; not a valid codepage.",
                                              "Codepage return was 0; Not a valid codepage."));
}

class UTF8ConvColumnTest : public UTF8ConvTest {
protected:
    /// What was found out about ASCII is valid until a trace level changes.
    void setCodePage(std::uint32_t codePage) {
        LocaleDouble::setCodePage(codePage);
        m_trace.setLevel(0);
    }
    std::string column(std::string_view text, std::size_t room = sizeof out) {
        std::strcpy(out, "untouched");
        const std::int32_t written = UTF8Conv::columnToUTF8(out, room, text);
        EXPECT_STREQ(out + written, &"untouched"[written]) << "nothing is written behind the text";
        return {out, static_cast<std::size_t>(written)};
    }
    /// What the framework is asked to translate, apart from all of ASCII.
    static std::vector<std::string> translated() {
        std::vector<std::string> texts;
        for (const LocaleDouble::Translation& translation : LocaleDouble::translations()) {
            EXPECT_EQ(translation.flags, LOC2_NO_TERMINATOR);
            if (translation.source.size() < 128) {
                texts.push_back(translation.source);
            }
        }
        return texts;
    }

    RecordingTrace m_trace{0};
};

TEST_F(UTF8ConvColumnTest, AsciiIsNotHandedToTheFramework) {
    EXPECT_EQ(column("abc{"), "abc{");
    EXPECT_EQ(column(""), "");
    EXPECT_THAT(translated(), ElementsAre());
}

TEST_F(UTF8ConvColumnTest, OtherTextsAreTranslated) {
    EXPECT_EQ(column("gr\xFC\xDF"), "gr\xC3\xBC\xC3\x9F");
    EXPECT_THAT(translated(), ElementsAre("gr\xFC\xDF"));
}

TEST_F(UTF8ConvColumnTest, ATextThatDoesNotFitIsTranslatedAsFarAsItFits) {
    EXPECT_EQ(column("abcd", 3), "abc");
    EXPECT_THAT(translated(), ElementsAre("abcd"));
}

TEST_F(UTF8ConvColumnTest, ACodePageWithOtherAsciiTranslatesAll) {
    for (int i = 0; i < 2; ++i) {
        setCodePage(LocaleDouble::germanPage);
        EXPECT_EQ(column("abc{"), "abc\xC3\xA4");
        EXPECT_EQ(column("abc"), "abc");
        setCodePage(LocaleDouble::latin1Page);
        EXPECT_EQ(column("abc{"), "abc{");
    }
    EXPECT_THAT(translated(), ElementsAre("abc{", "abc", "abc{", "abc"));
}

TEST_F(UTF8ConvColumnTest, WithoutACodePageNothingIsConverted) {
    setCodePage(0);
    EXPECT_EQ(column("abc"), "");
    EXPECT_THAT(m_trace.messages(), ElementsAre("Codepage returned was 0; not a valid codepage."));
}

TEST_F(UTF8ConvColumnTest, TheDetailClassTracesEachColumn) {
    m_trace.setLevel(TRC1_DETAIL);
    EXPECT_EQ(column("abc"), "abc");
    EXPECT_THAT(m_trace.messages(), ElementsAre("bytesCopied = 3"));
}

// The locale is looked up once per process and direction, so these cases need a fresh process.

void expect(bool condition) {
    if (!condition) {
        std::exit(1);
    }
}

class UTF8ConvDeathTest : public UTF8ConvTest {
protected:
    UTF8ConvDeathTest() { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

TEST_F(UTF8ConvDeathTest, EachDirectionLooksTheLocaleUpOnce) {
    EXPECT_EXIT(
        {
            expect(LocaleDouble::lookups() == 0);
            UTF8Conv::Convert_toUTF8(out, sizeof out, "abc", 3, 0);
            UTF8Conv::Convert_toUTF8(out, sizeof out, "abc", 3, 0);
            expect(LocaleDouble::lookups() == 1);
            UTF8Conv::Convert_fromUTF8(out, sizeof out, "abc", 3);
            UTF8Conv::Convert_fromUTF8(out, sizeof out, "abc", 3);
            expect(LocaleDouble::lookups() == 2);
            // What was found is kept.
            LocaleDouble::setHasLocale(false);
            expect(UTF8Conv::Convert_toUTF8(out, sizeof out, "abc", 3, 0) == 3);
            std::exit(0);
        },
        ExitedWithCode(0), "^$");
}

TEST_F(UTF8ConvDeathTest, WithoutALocaleEachCallReportsItAndConvertsNothing) {
    RecordingTrace trace(0);
    EXPECT_EXIT(
        {
            LocaleDouble::setHasLocale(false);
            expect(UTF8Conv::Convert_toUTF8(out, sizeof out, "abc", 3, 0) == 0);
            expect(UTF8Conv::Convert_fromUTF8(out, sizeof out, "abc", 3) == 0);
            LocaleDouble::setHasLocale(true); // too late
            expect(UTF8Conv::Convert_toUTF8(out, sizeof out, "abc", 3, 0) == 0);
            expect(std::string(out) == "untouched");
            expect(LocaleDouble::lookups() == 2);
            std::exit(0);
        },
        ExitedWithCode(0),
        "^Locale returned null; no locale found\\.\nLocale returned null; no locale found\\.\n"
        "Locale returned null; no locale found\\.\n$");
}

} // namespace
