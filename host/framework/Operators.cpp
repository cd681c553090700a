#include "host/framework/Operators.h"

#include "base/Ascii.h"
#include "framework/locale.h"

#include <algorithm>

#include <re2/re2.h>

namespace zrm::host {

namespace {

/// Memory for a pattern's program and its cached matching states, in bytes.
constexpr std::int64_t patternMemory = 2 * 1024 * 1024;

} // namespace

bool isRelational(_IntfOper op) noexcept {
    return op >= INTF_EQUAL && op <= INTF_GREATER;
}

bool compares(_IntfOper op, std::int64_t order) noexcept {
    switch (op) {
    case INTF_EQUAL:
        return order == 0;
    case INTF_NOT_EQUAL:
        return order != 0;
    case INTF_GREATER_OR_EQUAL:
        return order >= 0;
    case INTF_LESS_OR_EQUAL:
        return order <= 0;
    case INTF_LESS:
        return order < 0;
    case INTF_GREATER:
        return order > 0;
    }
    return false;
}

std::string_view textOf(const SEL1_FILTERINFO& filter) noexcept {
    return {filter.value, static_cast<std::size_t>(std::max<int>(filter.valueLength, 0))};
}

std::vector<std::string_view> linesOf(std::string_view text) {
    std::vector<std::string_view> lines;
    for (std::size_t end; (end = text.find('\n')) != std::string_view::npos;) {
        lines.push_back(text.substr(0, end));
        text.remove_prefix(end + 1);
    }
    lines.push_back(text);
    return lines;
}

PatternText patternTextOf(bool isUtf8Column, std::string_view pattern) {
    const bool isByBytes = !isUtf8Column && isAscii(pattern) &&
                           LOC2_GetLocaleNumInfo(LOC2_GetLocale(0, 0, 0, nullptr), LOC2_CODEPAGE,
                                                 nullptr) != LOC2_UTF8;
    return isByBytes ? PatternText::bytes : PatternText::utf8;
}

std::unique_ptr<re2::RE2> compiledPattern(std::string_view pattern, PatternText text) {
    re2::RE2::Options options;
    options.set_log_errors(false);
    options.set_max_mem(patternMemory);
    if (text == PatternText::bytes) {
        options.set_encoding(re2::RE2::Options::EncodingLatin1);
    }
    return std::make_unique<re2::RE2>(re2::StringPiece(pattern.data(), pattern.size()), options);
}

} // namespace zrm::host
