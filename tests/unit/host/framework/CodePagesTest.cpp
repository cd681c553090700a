#include "host/framework/CodePages.h"

#include "host/framework/Converter.h"
#include "host/framework/IconvCache.h"

#include <gtest/gtest.h>

using namespace zrm::host;

namespace {

std::uint32_t numberOf(std::string_view codeSet) {
    return CodePages::byName(codeSet)->codePage;
}

TEST(CodePages, KnowsCodeSetsByName) {
    EXPECT_EQ(numberOf("UTF-8"), 1208u);
    EXPECT_EQ(numberOf("ANSI_X3.4-1968"), 367u);
    EXPECT_EQ(numberOf("US-ASCII"), 367u);
    EXPECT_EQ(numberOf("ISO-8859-1"), 819u);
    EXPECT_EQ(numberOf("ISO-8859-15"), 923u);
    EXPECT_EQ(numberOf("ISO-8859-2"), 912u);
    EXPECT_EQ(numberOf("ISO-8859-5"), 915u);
    EXPECT_EQ(numberOf("ISO-8859-7"), 813u);
    EXPECT_EQ(numberOf("ISO-8859-9"), 920u);
    EXPECT_EQ(numberOf("IBM-850"), 850u);
    EXPECT_EQ(numberOf("windows-1252"), 1252u);
    EXPECT_EQ(numberOf("CP1251"), 1251u);
    EXPECT_EQ(numberOf("EUC-JP"), 954u);
    EXPECT_EQ(numberOf("Shift_JIS"), 932u);
    EXPECT_EQ(numberOf("GB18030"), 1392u);
    EXPECT_EQ(numberOf("KOI8-R"), 878u);
}

TEST(CodePages, AcceptsTheSpellingsOfVariousSystems) {
    EXPECT_EQ(numberOf("utf8"), 1208u);
    EXPECT_EQ(numberOf("UTF_8"), 1208u);
    EXPECT_EQ(numberOf("ISO8859-1"), 819u);
    EXPECT_EQ(numberOf("iso_8859_1"), 819u);
    EXPECT_EQ(numberOf("eucJP"), 954u);
}

TEST(CodePages, UnknownCodeSetsHaveNoNumber) {
    EXPECT_EQ(numberOf(""), 0u);
    EXPECT_EQ(numberOf("UTF"), 0u);
    EXPECT_EQ(numberOf("UTF-88"), 0u);
    EXPECT_EQ(numberOf("ISO-8859-17"), 0u);
    EXPECT_EQ(CodePages::byNumber(0), nullptr);
    EXPECT_EQ(CodePages::byNumber(4711), nullptr);
}

TEST(CodePages, EveryNumberCanBeConvertedToUtf8AndBack) {
    const LOC2_Locale& utf8 = *CodePages::byNumber(1208);
    int known = 0;
    for (std::uint32_t number = 1; number < 2000; ++number) {
        const LOC2_Locale* const codeSet = CodePages::byNumber(number);
        if (codeSet == nullptr) {
            continue;
        }
        ++known;
        EXPECT_EQ(codeSet->codePage, number);
        EXPECT_NE(IconvCache::find(utf8, *codeSet), IconvCache::none()) << codeSet->codeSet;
        EXPECT_NE(IconvCache::find(*codeSet, utf8), IconvCache::none()) << codeSet->codeSet;
        // The fast path relies on this.
        std::string ascii;
        for (char c = 1; c < 127; ++c) {
            ascii += c;
        }
        ascii.erase(ascii.find('~'), 1);  // Japanese code sets may show an overline for it,
        ascii.erase(ascii.find('\\'), 1); // and a yen sign for this
        std::string target(ascii.size() * 4, '\0');
        char* in = ascii.data();
        std::size_t inLeft = ascii.size();
        char* out = target.data();
        std::size_t outLeft = target.size();
        const iconv_t converter = IconvCache::find(utf8, *codeSet);
        EXPECT_EQ(iconv(converter, &in, &inLeft, &out, &outLeft), 0u);
        EXPECT_EQ(iconv(converter, nullptr, nullptr, &out, &outLeft), 0u);
        target.resize(target.size() - outLeft);
        EXPECT_EQ(target, ascii) << codeSet->codeSet;
    }
    EXPECT_GT(known, 40);
}

} // namespace
