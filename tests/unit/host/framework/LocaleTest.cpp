#include "framework/locale.h"

#include "support/Faults.h"

#include <gtest/gtest.h>

#include <clocale>
#include <cstring>
#include <string>

namespace {

class LocaleTest : public testing::Test {
protected:
    ~LocaleTest() override { std::setlocale(LC_ALL, "C"); }

    /// Code page of the process's locale after setting it.
    static std::uint32_t codePageOf(const char* locale) {
        EXPECT_NE(std::setlocale(LC_ALL, locale), nullptr) << locale;
        std::uint32_t status = 99;
        LOC2_Locale* const handle = LOC2_GetLocale(0, 0, 0, &status);
        EXPECT_NE(handle, nullptr);
        EXPECT_EQ(status, 0u);
        status = 99;
        const std::uint32_t codePage = LOC2_GetLocaleNumInfo(handle, LOC2_CODEPAGE, &status);
        EXPECT_EQ(status, 0u);
        return codePage;
    }

    struct Result {
        std::int32_t written;
        std::uint32_t length;
        std::uint32_t status;
        std::string target; ///< the whole target and what follows it
    };
    static Result translate(std::uint32_t to, std::uint32_t from, std::string_view source,
                            std::uint32_t size, int flags) {
        Result result{0, 99, 99, std::string(size + 4, '#')};
        result.written = LOC2_TranslateString(to, result.target.data(), size, from, source.data(),
                                              static_cast<std::uint32_t>(source.size()),
                                              &result.length, flags, &result.status);
        EXPECT_EQ(static_cast<std::uint32_t>(result.written), result.length);
        return result;
    }
    static std::string terminated(std::string_view text, std::size_t size) {
        std::string target(text);
        target += '\0';
        target.resize(size + 4, '#');
        return target;
    }
};

TEST_F(LocaleTest, TheProcesssLocaleHasItsCodePage) {
    EXPECT_EQ(codePageOf("C"), 367u);
    EXPECT_EQ(codePageOf("C.UTF-8"), 1208u);
}

TEST_F(LocaleTest, HasNoFurtherInformation) {
    LOC2_Locale* const locale = LOC2_GetLocale(0, 0, 0, nullptr);
    std::uint32_t status = 0;
    EXPECT_EQ(LOC2_GetLocaleNumInfo(locale, 8, &status), 0u);
    EXPECT_NE(status, 0u);
    EXPECT_EQ(LOC2_GetLocaleNumInfo(nullptr, LOC2_CODEPAGE, nullptr), 0u);
}

TEST_F(LocaleTest, FlagsOfZeroTerminateWithinTheTarget) {
    Result result = translate(1208, 819, "Gr\xFC\xDF", 10, 0);
    EXPECT_EQ(result.written, 6);
    EXPECT_EQ(result.status, 0u);
    EXPECT_EQ(result.target, terminated("Grüß", 10));
    result = translate(1208, 1208, "abcdef", 6, 0);
    EXPECT_EQ(result.written, 5);
    EXPECT_NE(result.status, 0u) << "it was cut";
    EXPECT_EQ(result.target, terminated("abcde", 6));
    result = translate(1208, 1208, "ab€", 5, 0);
    EXPECT_EQ(result.written, 2) << "the terminator replaces the last byte";
    EXPECT_EQ(result.target, terminated("ab", 5));
    result = translate(1208, 1208, "abc", 1, 0);
    EXPECT_EQ(result.target, terminated("", 1));
    result = translate(1208, 1208, "abc", 0, 0);
    EXPECT_EQ(result.written, 0);
    EXPECT_EQ(result.target, "####");
    result = translate(1208, 1208, "", 3, 0);
    EXPECT_EQ(result.status, 0u);
    EXPECT_EQ(result.target, terminated("", 3));
}

TEST_F(LocaleTest, WithoutATerminatorThePaddingStays) {
    Result result = translate(1208, 819, "Gr\xFC\xDF", 10, LOC2_NO_TERMINATOR);
    EXPECT_EQ(result.written, 6);
    EXPECT_EQ(result.target, "Grüß########");
    result = translate(1208, 1208, "abcdef", 6, LOC2_NO_TERMINATOR);
    EXPECT_EQ(result.written, 6);
    EXPECT_EQ(result.status, 0u);
    EXPECT_EQ(result.target, "abcdef####");
    result = translate(1208, 1208, "ab€€", 7, LOC2_NO_TERMINATOR);
    EXPECT_EQ(result.written, 5);
    EXPECT_EQ(result.target, "ab€######");
    result = translate(1208, 1208, "", 3, LOC2_NO_TERMINATOR);
    EXPECT_EQ(result.target, "#######");
    result = translate(1208, 1208, "abc", 0, LOC2_NO_TERMINATOR);
    EXPECT_EQ(result.written, 0);
}

TEST_F(LocaleTest, AnInvalidByteIsReplaced) {
    EXPECT_EQ(translate(1208, 1208, "a\xFFz", 10, 0).target, terminated("a\uFFFDz", 10));
    EXPECT_EQ(translate(1208, 367, "a\xE9z", 10, 0).target, terminated("a\uFFFDz", 10));
    EXPECT_EQ(translate(367, 1208, "aéz", 10, 0).target, terminated("a\x1Az", 10));
}

TEST_F(LocaleTest, AsciiIsCopiedAsFarAsThereIsRoom) {
    const std::string text(40, 'x');
    for (const std::uint32_t codePage : {1208u, 367u, 819u}) {
        const Result fitting = translate(1208, codePage, text, 40, LOC2_NO_TERMINATOR);
        EXPECT_EQ(fitting.written, 40);
        EXPECT_EQ(fitting.status, 0u);
        EXPECT_EQ(fitting.target.substr(0, 41), text + '#');
        const Result cut = translate(1208, codePage, text, 39, LOC2_NO_TERMINATOR);
        EXPECT_EQ(cut.written, 39);
        EXPECT_NE(cut.status, 0u);
        EXPECT_EQ(cut.target.substr(0, 40), text.substr(1) + '#');
    }
    EXPECT_EQ(translate(1208, 1208, "", 10, LOC2_NO_TERMINATOR).written, 0);
}

TEST_F(LocaleTest, AnUnknownCodePageConvertsNothing) {
    for (const std::uint32_t unknown : {0u, 4711u}) {
        const Result result = translate(1208, unknown, "abc", 10, 0);
        EXPECT_EQ(result.written, 0);
        EXPECT_NE(result.status, 0u);
        EXPECT_EQ(result.target, terminated("", 10));
        EXPECT_EQ(translate(unknown, 1208, "abc", 10, LOC2_NO_TERMINATOR).target,
                  std::string(14, '#'));
    }
}

TEST_F(LocaleTest, LengthAndStatusAreOptional) {
    char target[8];
    EXPECT_EQ(LOC2_TranslateString(1208, target, sizeof target, 819, "abc", 3, nullptr, 0, nullptr),
              3);
    EXPECT_STREQ(target, "abc");
}

} // namespace
