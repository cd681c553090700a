#include "ScanCase.h"

#include <cstdlib>
#include <iostream>

namespace {

std::uint64_t environmentNumber(const char* name, std::uint64_t missing) {
    const char* text = std::getenv(name);
    return text != nullptr ? std::strtoull(text, nullptr, 10) : missing;
}

} // namespace

CaseGenerator::CaseGenerator(const char* what)
    : m_seed(environmentNumber("ZRM_TEST_SEED", std::random_device{}())),
      m_cases(static_cast<int>(environmentNumber("ZRM_TEST_CASES", 200000))), m_random(m_seed) {
    std::cout << what << ": ZRM_TEST_SEED=" << m_seed << " ZRM_TEST_CASES=" << m_cases << '\n';
}

std::string CaseGenerator::literal() {
    constexpr const char* pieces[] = {"",   "",  " ",  "\t", "\n", "-",  ":", "[",  "]", "a",
                                      "%%", "x", "ab", ", ", "0",  "12", "+", "  ", "E", "\xe9"};
    std::string text;
    for (unsigned count = below(4); count > 0; --count) {
        const std::string piece = pick(pieces);
        // No white space before a byte beyond ASCII: in some locales the C library fails to skip
        // it there.
        if (piece[0] == '\xe9' && !text.empty() && (text.back() <= ' ' && text.back() >= 0)) {
            continue;
        }
        text += piece;
    }
    return text;
}

std::string CaseGenerator::scanSet() {
    constexpr const char* members[] = {"a-f", "0-9", "a^", "-",   "]x",       "z-a",
                                       "\t",  " ",   ".",  "+--", "a",        "%",
                                       "--/", ":",   "A-", "[",   "\xe0-\xff"};
    std::string set = oneIn(2) ? "^" : "";
    if (oneIn(4)) {
        set += oneIn(2) ? "]" : "-";
    }
    for (unsigned count = 1 + below(3); count > 0; --count) {
        std::string member = pick(members);
        if (member[0] == ']') {
            member.erase(0, 1);
        }
        set += member;
    }
    return "[" + set + "]";
}

std::string CaseGenerator::scanDirective() {
    constexpr const char* sizes[] = {"", "", "", "h", "l", "ll", "L"};
    constexpr const char* integers[] = {"d", "i", "o", "u", "x"};
    constexpr const char* floatSizes[] = {"", "l", "L"};
    constexpr const char* floats[] = {"e", "f", "g"};
    std::string directive = literal() + "%" + (oneIn(6) ? "*" : "");
    const unsigned kind = below(5);
    const std::string width =
        oneIn(2) ? std::to_string(1 + (oneIn(10) ? below(1023) : below(9))) : "";
    if (kind <= 1) {
        directive += width + pick(sizes) + pick(integers);
    } else if (kind == 2) {
        directive += width + pick(floatSizes) + pick(floats);
    } else if (kind == 3) {
        directive += width + (oneIn(2) ? "c" : "s");
    } else {
        directive += width + scanSet();
    }
    return directive + "%n";
}

std::string CaseGenerator::number() {
    constexpr const char* pieces[] = {
        "0",
        "1",
        "7",
        "8",
        "9",
        "12",
        "0x",
        "0X",
        "f",
        "A",
        "e",
        "E",
        "p",
        ".",
        "-",
        "+",
        "nan",
        "inf",
        "i",
        "n",
        "NaN",
        "INFINITY",
        "in",
        "00",
        "e+",
        "e-3",
        "p-2",
        "infinit",
        "1e5",
        "g",
        "08",
        "0xg",
        ".5",
        "5.",
        "99",
        "0x1p",
        "%",
        "1e99",
        "9223372036854775807",
        "18446744073709551616",
    };
    std::string text = oneIn(3) ? (oneIn(2) ? "-" : "+") : "";
    if (oneIn(3)) {
        return text + std::to_string(m_random() >> below(64));
    }
    for (unsigned count = 1 + below(4); count > 0; --count) {
        text += pick(pieces);
    }
    return text;
}

std::string CaseGenerator::textFor(const std::string& directive) {
    constexpr const char* blanks[] = {"", "", " ", "  ", "\t", "\n", " \v\f\r"};
    constexpr const char* words[] = {"abc",  "a b",      "x",  "]x-", "fed.cba", "+,-./",
                                     "A-[z", "\xe9\xe8", "%%", "^^",  "12ab",    ""};
    const std::string literalText = directive.substr(0, directive.find('%'));
    std::string text;
    for (const char character : literalText) {
        if (character == ' ' || character == '\t' || character == '\n') {
            text += pick(blanks);
        } else if (!oneIn(20)) {
            text += character;
        }
    }
    if (directive.compare(literalText.size(), 2, "%%") == 0) {
        text += pick(blanks) + "%";
    }
    text += pick(blanks);
    for (unsigned count = below(4); count > 0; --count) {
        text += oneIn(3) ? pick(words) : number();
        text += pick(blanks);
    }
    return text;
}
