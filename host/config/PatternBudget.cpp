#include "host/config/PatternBudget.h"

#include <cstdint>
#include <utility>

#include <re2/re2.h>

namespace zrm::host {

namespace {

tl::unexpected<Problem> badValue(std::string what, std::string cure) {
    return refused(std::move(what), std::move(cure), "value");
}

std::string quoted(const std::string& text) {
    return '\'' + text + '\'';
}

} // namespace

/// Checks a regular expression. Compilation stops not far above the largest size: its
/// memory limit allows a few times as much.
Result<void> PatternBudget::checkRegex(const std::string& value) {
    constexpr std::int64_t memory = 512 * 1024;
    constexpr const char* cure =
        "repeat less, and write [A-Za-z] or \\w instead of a class of Unicode such as \\pL";
    if (isSpent()) {
        return badValue(
            "the regular expressions before this one already reach the limit for all of them",
            cure);
    }
    RE2::Options options(RE2::Quiet);
    options.set_max_mem(memory);
    const RE2 pattern(value, options);
    const std::size_t size =
        pattern.ok() ? static_cast<std::size_t>(pattern.ProgramSize()) : std::size_t{0};
    if (size > ofPattern || pattern.error_code() == RE2::ErrorPatternTooLarge) {
        spend(ofPattern);
        return badValue(quoted(value) + " is too large a regular expression", cure);
    }
    if (!pattern.ok()) {
        return badValue(quoted(value) + " is not a regular expression: " + pattern.error(),
                        "correct it (RE2 syntax)");
    }
    spend(size);
    if (isExceeded()) {
        return badValue("together with this one the regular expressions are too large", cure);
    }
    return {};
}

Result<void> PatternBudget::check(_IntfOper op, const std::string& value) {
    if (value.empty() || value.size() > longestPattern) {
        return badValue("the value has " + std::to_string(value.size()) + " bytes",
                        "write 1 to " + std::to_string(longestPattern) + " bytes");
    }
    return op == INTF_MATCHES ? checkRegex(value) : Result<void>();
}

} // namespace zrm::host
