#include "parser/ScanProgram.h"

#include "ScanCase.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstring>
#include <limits>
#include <string>

using namespace zrm;

namespace {

/// A receiving variable that shows writes past a value.
using Storage = std::array<unsigned char, 1100>;

struct Result {
    int consumed = 0;
    Storage value{};
};

/// Clears the padding bytes of a long double, which are undefined.
void clearPadding(const std::string& directive, Result& result) {
    constexpr bool isPadded = std::numeric_limits<long double>::digits == 64;
    if (isPadded && directive.find_first_of("efg", directive.rfind('L')) != std::string::npos) {
        std::fill(result.value.begin() + 10, result.value.begin() + sizeof(long double),
                  static_cast<unsigned char>(0));
    }
}

unsigned textWidth(const std::string& directive) {
    return directive.find("%*") == std::string::npos ? 31 : 0;
}

Result scanned(const std::string& directive, const std::string& text) {
    ScanProgram program;
    program.compile(directive.c_str(), textWidth(directive));
    Result result;
    result.consumed = program.run(text.c_str(), result.value.data());
    return result;
}

/// The C library's answer to the same directive. Texts without a width get theirs first, as they
/// do where directives are learned.
Result scannedByLibrary(std::string directive, const std::string& text) {
    std::size_t start = 0;
    while (directive[start] != '%' || directive[start + 1] == '%') {
        start += directive[start] == '%' ? 2 : 1;
    }
    const char code = directive[start + 1];
    if (code == 's' || code == '[') {
        directive.insert(start + 1, "31");
    }
    Result result;
    int count = 0;
    int fields = 0;
    if (code == '*') {
        fields = std::sscanf(text.c_str(), directive.c_str(), &count);
    } else {
        fields = std::sscanf(text.c_str(), directive.c_str(), result.value.data(), &count);
    }
    result.consumed = fields == EOF ? ScanProgram::endOfInput : count;
    return result;
}

template <typename Type> Type value(const Result& result) {
    Type number;
    std::memcpy(&number, result.value.data(), sizeof number);
    return number;
}

std::string text(const Result& result) {
    return reinterpret_cast<const char*>(result.value.data());
}

std::string shown(const std::string& text) {
    std::string result;
    for (const char character : text) {
        char code[8];
        std::snprintf(code, sizeof code, character >= ' ' ? "%c" : "\\x%02x",
                      static_cast<unsigned char>(character));
        result += code;
    }
    return result;
}

TEST(ScanProgram, AgreesWithTheCLibrary) {
    CaseGenerator generator("ScanProgram against sscanf");
    int matched = 0;
    for (int number = 0; number < generator.cases(); ++number) {
        const std::string directive = generator.scanDirective();
        const std::string line = generator.textFor(directive);
        Result ours = scanned(directive, line);
        Result theirs = scannedByLibrary(directive, line);
        clearPadding(directive, ours);
        clearPadding(directive, theirs);
        ASSERT_EQ(ours.consumed, theirs.consumed)
            << "case " << number << ": \"" << shown(directive) << "\" on \"" << shown(line) << '"';
        if (ours.consumed > 0) {
            ++matched;
            ASSERT_EQ(ours.value, theirs.value) << "case " << number << ": \"" << shown(directive)
                                                << "\" on \"" << shown(line) << '"';
        }
    }
    EXPECT_GT(matched, generator.cases() / 5);
    EXPECT_LT(matched, generator.cases() / 5 * 4);
}

TEST(ScanProgram, ReadsIntegersInTheirSizes) {
    EXPECT_EQ(value<std::int32_t>(scanned("%d%n", "  -17x")), -17);
    EXPECT_EQ(scanned("%d%n", "  -17x").consumed, 5);
    EXPECT_EQ(value<std::int16_t>(scanned("%hd%n", "70000")), 4464);
    EXPECT_EQ(value<std::int64_t>(scanned("%Ld%n", "9223372036854775808")),
              std::numeric_limits<std::int64_t>::max());
    EXPECT_EQ(value<std::uint64_t>(scanned("%llu%n", "-1")),
              std::numeric_limits<std::uint64_t>::max());
    EXPECT_EQ(value<std::int32_t>(scanned("%d%n", "99999999999999999999")), -1);
    EXPECT_EQ(value<std::int32_t>(scanned("%d%n", "-99999999999999999999")), 0);
}

TEST(ScanProgram, ReadsTheBaseFromThePrefix) {
    EXPECT_EQ(value<std::int32_t>(scanned("%i%n", "0x1fg")), 31);
    EXPECT_EQ(value<std::int32_t>(scanned("%i%n", "017")), 15);
    EXPECT_EQ(value<std::int32_t>(scanned("%i%n", "17")), 17);
    EXPECT_EQ(scanned("%x%n", "0x").consumed, 2);
    EXPECT_EQ(scanned("%i%n", "08").consumed, 1);
    EXPECT_EQ(scanned("%2x%n", "0x1").consumed, 2);
}

TEST(ScanProgram, StopsAtTheWidth) {
    EXPECT_EQ(value<std::int32_t>(scanned("%4d%n", "20261120")), 2026);
    EXPECT_EQ(scanned("%1d%n", "-5").consumed, ScanProgram::mismatch);
    EXPECT_EQ(text(scanned("%3s%n", "abcdef")), "abc");
    EXPECT_EQ(text(scanned("%s%n", std::string(40, 'x'))), std::string(31, 'x'));
    EXPECT_EQ(text(scanned("%[x]%n", std::string(40, 'x'))), std::string(31, 'x'));
}

TEST(ScanProgram, SuppressedTextsHaveNoLimitOfTheirOwn) {
    EXPECT_EQ(scanned("%*s%n", std::string(2000, 'x') + " y").consumed, 2000);
    EXPECT_EQ(scanned("%*[x]%n", std::string(2000, 'x')).consumed, 2000);
    EXPECT_EQ(scanned("%*5s%n", "abcdefgh").consumed, 5);
}

TEST(ScanProgram, ReadsCharactersUnchanged) {
    EXPECT_EQ(text(scanned("%5c%n", " a\tb cd")), " a\tb ");
    EXPECT_EQ(text(scanned("%5c%n", "ab")), "ab");
    Storage storage;
    storage.fill('#');
    ScanProgram program;
    program.compile("%c%n", 0);
    EXPECT_EQ(program.run("xy", storage.data()), 1);
    EXPECT_EQ(storage[0], 'x');
    EXPECT_EQ(storage[1], '#') << "a single character is not terminated";
    program.compile("%4c%n", 0);
    EXPECT_EQ(program.run("xy", storage.data()), 2);
    EXPECT_STREQ(reinterpret_cast<char*>(storage.data()), "xy") << "nothing of the previous line";
}

TEST(ScanProgram, DistinguishesTheEndOfInputFromAMismatch) {
    EXPECT_EQ(scanned("%d%n", "").consumed, ScanProgram::endOfInput);
    EXPECT_EQ(scanned("%d%n", " \t\n").consumed, ScanProgram::endOfInput);
    EXPECT_EQ(scanned("ab%d%n", "a").consumed, ScanProgram::endOfInput);
    EXPECT_EQ(scanned("%[a]%n", "").consumed, ScanProgram::endOfInput);
    EXPECT_EQ(scanned("%c%n", "").consumed, ScanProgram::endOfInput);
    EXPECT_EQ(scanned("%d%n", "x").consumed, ScanProgram::mismatch);
    EXPECT_EQ(scanned("%d%n", "-").consumed, ScanProgram::mismatch);
    EXPECT_EQ(scanned("%f%n", "+").consumed, ScanProgram::mismatch);
    EXPECT_EQ(scanned("ab%d%n", "ac1").consumed, ScanProgram::mismatch);
    EXPECT_EQ(scanned("%[a]%n", "b").consumed, ScanProgram::mismatch);
}

TEST(ScanProgram, ReadsFloatingPointNumbersOfAnyLength) {
    EXPECT_EQ(value<float>(scanned("%f%n", "2.5e1,")), 25.0F);
    EXPECT_EQ(scanned("%f%n", "2.5e1,").consumed, 5);
    EXPECT_EQ(value<double>(scanned("%lg%n", "0x1.8p3")), 12.0);
    EXPECT_EQ(value<double>(scanned("%le%n", "-infinity")),
              -std::numeric_limits<double>::infinity());
    EXPECT_EQ(value<long double>(scanned("%Lf%n", "1" + std::string(600, '0') + "1")),
              scannedByLibrary("%Lf%n", "1" + std::string(600, '0') + "1").consumed > 0
                  ? value<long double>(scannedByLibrary("%Lf%n", "1" + std::string(600, '0') + "1"))
                  : 0.0L);
    EXPECT_EQ(scanned("%3f%n", "1.25").consumed, 3);
    EXPECT_EQ(scanned("%f%n", "0x").consumed, ScanProgram::mismatch);
    EXPECT_EQ(scanned("%f%n", "infin").consumed, ScanProgram::mismatch);
    EXPECT_EQ(scanned("%f%n", ".").consumed, ScanProgram::mismatch);
    EXPECT_EQ(scanned("%f%n", "1e+").consumed, 3) << "the lone exponent belongs to the field";
}

TEST(ScanProgram, PercentSignsAndWhiteSpaceOfTheLiteral) {
    EXPECT_EQ(scanned("%%%d%n", "  %7").consumed, 4);
    EXPECT_EQ(scanned("a %d%n", "a\t\n7").consumed, 4);
    EXPECT_EQ(scanned(" %c%n", "   x").consumed, 4);
    EXPECT_EQ(scanned("%c%n", "   x").consumed, 1);
    // The "C" locale's scanner skips white space before any byte.
    EXPECT_EQ(scanned(" \xe9%d%n", "  \xe9"
                                   "1")
                  .consumed,
              4);
}

TEST(ScanProgram, ADirectiveWithoutItsCountMatchesNothing) {
    EXPECT_EQ(scanned("%d", "12").consumed, ScanProgram::mismatch);
    EXPECT_EQ(scanned("%d", "").consumed, ScanProgram::endOfInput);
    EXPECT_EQ(scanned("no conversion", "no conversion").consumed, ScanProgram::mismatch);
    EXPECT_EQ(scanned("%hs%n", "x").consumed, ScanProgram::mismatch);
}

} // namespace
