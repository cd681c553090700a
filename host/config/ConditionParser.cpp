#include "host/config/ConditionParser.h"

#include <algorithm>
#include <charconv>
#include <string>
#include <utility>

namespace zrm::host {

namespace {

constexpr const char* form = "write COLUMN OP VALUE, for example ENTRYDESC contains 'failed'";

/// Scans the text from its beginning.
class Scanner {
public:
    explicit Scanner(std::string_view text) : m_rest(text) {}

    void skipBlanks() {
        m_rest.remove_prefix(std::min(m_rest.find_first_not_of(" \t"), m_rest.size()));
    }
    bool atEnd() const { return m_rest.empty(); }
    std::string_view rest() const { return m_rest; }
    bool take(char c) {
        if (m_rest.empty() || m_rest.front() != c) {
            return false;
        }
        m_rest.remove_prefix(1);
        return true;
    }
    /// The longest prefix of characters for which `belongs` holds.
    template <typename Predicate> std::string_view takeWhile(Predicate belongs) {
        const auto end = std::find_if_not(m_rest.begin(), m_rest.end(), belongs);
        const auto length = static_cast<std::size_t>(end - m_rest.begin());
        const std::string_view taken = m_rest.substr(0, length);
        m_rest.remove_prefix(length);
        return taken;
    }

private:
    std::string_view m_rest;
};

bool isWordCharacter(char c) {
    return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') || c == '_';
}
bool isSign(char c) {
    return c == '=' || c == '!' || c == '<' || c == '>' || c == '~';
}

tl::unexpected<Problem> badValue(std::string what, std::string cure) {
    return refused(std::move(what), std::move(cure), "value");
}

Result<std::string> quotedText(Scanner& scanner) {
    std::string text;
    while (!scanner.atEnd()) {
        text += scanner.takeWhile([](char c) { return c != '\''; });
        if (!scanner.take('\'')) {
            break;
        }
        if (!scanner.take('\'')) {
            return text;
        }
        text += '\'';
    }
    return badValue("the text has no closing quote", "end it with '");
}

template <typename Number> bool isNumber(std::string_view word, Number& number) {
    const auto [end, error] = std::from_chars(word.data(), word.data() + word.size(), number);
    return error == std::errc() && end == word.data() + word.size();
}

Result<ConditionValue::Item> item(Scanner& scanner) {
    scanner.skipBlanks();
    if (scanner.take('\'')) {
        return quotedText(scanner).map(
            [](std::string&& text) { return ConditionValue::Item(std::move(text)); });
    }
    const std::string_view word =
        scanner.takeWhile([](char c) { return c != ',' && c != ']' && c != ' ' && c != '\t'; });
    if (word.empty()) {
        return badValue("the value is missing", form);
    }
    std::int64_t whole = 0;
    double decimal = 0;
    if (isNumber(word, whole)) {
        return whole;
    }
    // The library also reads "inf" and "nan".
    if (word.find_first_not_of("0123456789.+-eE") == word.npos && isNumber(word, decimal)) {
        return decimal;
    }
    return badValue("'" + std::string(word) + "' is not a value",
                    "write text in single quotes and numbers without");
}

/// Reads the rest of a list, behind its bracket.
Result<ConditionValue> list(Scanner& scanner) {
    ConditionValue value;
    value.isList = true;
    scanner.skipBlanks();
    if (scanner.take(']')) {
        return value;
    }
    do {
        Result<ConditionValue::Item> one = item(scanner);
        if (!one) {
            return tl::unexpected(one.error());
        }
        value.items.push_back(std::move(*one));
        scanner.skipBlanks();
    } while (scanner.take(','));
    if (!scanner.take(']')) {
        return badValue("the list has no end", "end it with ]");
    }
    return value;
}

Result<ConditionValue> single(Scanner& scanner) {
    return item(scanner).map([](ConditionValue::Item&& one) {
        return ConditionValue{{std::move(one)}, false};
    });
}

/// Reads the name of a column, or "field." and the name of a field, which may be in quotes.
Result<std::string> columnName(Scanner& scanner) {
    std::string name(scanner.takeWhile(isWordCharacter));
    if (name.empty()) {
        return refused("the column is missing", form, "column");
    }
    if (!scanner.take('.')) {
        return name;
    }
    name += '.';
    if (!scanner.take('\'')) {
        return name.append(scanner.takeWhile(&ConditionBuilder::isPlainFieldCharacter));
    }
    return quotedText(scanner).map([&](std::string&& field) { return name + field; });
}

/// Reads a value, behind which nothing may follow.
Result<ConditionValue> lastValue(Scanner& scanner) {
    Result<ConditionValue> value = scanner.take('[') ? list(scanner) : single(scanner);
    scanner.skipBlanks();
    if (value && !scanner.atEnd()) {
        return badValue("'" + std::string(scanner.rest()) + "' follows the value",
                        "write one condition per text");
    }
    return value;
}

} // namespace

Result<Condition> ConditionParser::parse(std::string_view text, PatternBudget& budget) const {
    Scanner scanner(text);
    scanner.skipBlanks();
    const Result<std::string> column = columnName(scanner);
    if (!column) {
        return tl::unexpected(column.error());
    }
    scanner.skipBlanks();
    std::string_view op = scanner.takeWhile(isSign);
    if (op.empty()) {
        op = scanner.takeWhile(isWordCharacter);
    }
    if (op.empty()) {
        return refused("the operator is missing", form, "op");
    }
    scanner.skipBlanks();
    const Result<ConditionValue> value = lastValue(scanner);
    if (value) {
        return m_builder.build(*column, op, *value, budget);
    }
    // A wrong column or operator is a better message than a value that is unreadable because of it.
    Result<Condition> probe = m_builder.build(*column, op, {{std::string("x")}, false}, budget);
    if (!probe && probe.error().field != "value") {
        return probe;
    }
    return tl::unexpected(value.error());
}

} // namespace zrm::host
