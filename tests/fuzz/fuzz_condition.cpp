#include "host/config/ConditionParser.h"

#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

using namespace zrm::host;

// Any text gives a condition or a problem with its cure; the text of a condition, written anew from
// what was read, gives the same condition.

namespace {

std::string quoted(std::string_view text) {
    std::string result = "'";
    for (const char c : text) {
        result += c == '\'' ? "''" : std::string(1, c);
    }
    return result + "'";
}

/// Numbers that fields are compared with are kept as text, since they may have a fraction.
std::string numberOf(const Condition& condition) {
    return condition.text.empty() ? std::to_string(condition.number) : condition.text;
}

std::string written(const Condition& condition) {
    const char* const names[] = {"", "=", "!=", ">=", "<=", "<", ">"};
    const char* const own[] = {"contains", "starts", "matches", "in"};
    std::string text = ConditionBuilder::written(condition.column) + ' ';
    text += condition.op < INTF_CONTAINS ? names[condition.op] : own[condition.op - INTF_CONTAINS];
    if (condition.op != INTF_IN) {
        return text + (condition.isNumber ? ' ' + numberOf(condition) : quoted(condition.text));
    }
    char separator = '[';
    for (const std::string& value : condition.values) {
        text += separator + (condition.isNumber ? value : quoted(value));
        separator = ',';
    }
    return text + ']';
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view text(reinterpret_cast<const char*>(data), size);
    for (const char* const table : {"RMLOGENT", "RMMONLOG"}) {
        const ConditionParser parser(table);
        const Result<Condition> condition = parser.parse(text);
        if (!condition) {
            const Problem& problem = condition.error();
            if (problem.what.empty() || problem.cure.empty() || problem.field.empty()) {
                std::abort();
            }
            continue;
        }
        const Result<Condition> again = parser.parse(written(*condition));
        if (!again || *again != *condition) {
            std::abort();
        }
    }
    return 0;
}
