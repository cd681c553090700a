#include "host/config/ConditionBuilder.h"

#include "base/EntryFields.h"
#include "host/base/TimeText.h"
#include "host/config/SourceConfig.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <charconv>
#include <iterator>
#include <limits>
#include <optional>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::size_t longestPattern = PatternBudget::longestPattern;
constexpr std::size_t mostValues = 1000;   ///< values in a list
constexpr std::size_t longestList = 16384; ///< total bytes of the values of a list

std::string quoted(std::string_view text) {
    return '\'' + std::string(text) + '\'';
}

std::string upperCase(std::string_view text) {
    std::string upper(text);
    std::transform(upper.begin(), upper.end(), upper.begin(), [](char c) {
        return static_cast<char>(std::toupper(static_cast<unsigned char>(c)));
    });
    return upper;
}

tl::unexpected<Problem> badValue(std::string what, std::string cure) {
    return refused(std::move(what), std::move(cure), "value");
}

/// Checks a value of a character column that is compared as a whole.
Result<void> checkWhole(const Column& column, std::string& value) {
    if (column.isTime && !value.empty()) {
        std::optional<std::string> stamp = TimeText::toStamp(value);
        if (!stamp) {
            return badValue(quoted(value) + " is not a time",
                            "write it like '2026-11-20T07:03:09', followed by Z or +01:00 unless "
                            "it is local, or as a 16-digit time stamp");
        }
        value = std::move(*stamp);
    }
    const auto width = static_cast<std::size_t>(column.width);
    if (value.size() > width) {
        return badValue("the value has " + std::to_string(value.size()) + " bytes and " +
                            std::string(column.name) + " holds " + std::to_string(width),
                        "shorten the value, or use starts");
    }
    return {};
}

Result<void> checkNumber(std::int64_t number) {
    if (number < std::numeric_limits<std::int32_t>::min() ||
        number > std::numeric_limits<std::int32_t>::max()) {
        return badValue("the number does not fit the column",
                        "write a number from -2147483648 to 2147483647");
    }
    return {};
}

tl::unexpected<Problem> notAnOperator(std::string_view op) {
    return refused(quoted(op) + " is not an operator",
                   "the operators are =, !=, >=, <=, <, >, contains, starts, matches, in", "op");
}

/// Checks that there is a list where the operator takes one, and only there.
Result<void> checkCount(_IntfOper code, std::string_view op, const ConditionValue& value) {
    if (value.isList == (code == INTF_IN)) {
        return {};
    }
    return value.isList ? badValue(quoted(op) + " takes one value", "use in for a list")
                        : badValue("in takes a list", "write the values in brackets");
}

/// Checks the sizes of a list, whose values the condition has.
Result<void> checkList(const Condition& condition) {
    std::size_t bytes = 0;
    for (const std::string& value : condition.values) {
        bytes += value.size() + 1;
        if (value.find('\n') != std::string::npos) {
            return badValue("a value of the list has a line end",
                            "no column can contain one: remove it");
        }
    }
    if (condition.values.empty() || condition.values.size() > mostValues) {
        return badValue("the list has " + std::to_string(condition.values.size()) + " values",
                        "write 1 to " + std::to_string(mostValues) + " values");
    }
    if (bytes > longestList) {
        return badValue("the list has " + std::to_string(bytes) + " bytes",
                        "write at most " + std::to_string(longestList));
    }
    return {};
}

Result<void> checkFieldName(std::string_view field) {
    const auto refuse = [](std::string what) {
        return refused(std::move(what), "write field. and 1 to 255 bytes, without NUL", "column");
    };
    if (field.empty()) {
        return refuse("the field has no name");
    }
    if (field.size() > EntryFields::longestName) {
        return refuse("the field's name has " + std::to_string(field.size()) + " bytes");
    }
    return field.find('\0') == field.npos ? Result<void>() : refuse("the field's name has a NUL");
}

/// A number as conditions on fields have it.
std::string numberText(const ConditionValue::Item& item) {
    if (const auto* const whole = std::get_if<std::int64_t>(&item)) {
        return std::to_string(*whole);
    }
    char text[32];
    const auto end = std::to_chars(std::begin(text), std::end(text), std::get<double>(item));
    return {text, end.ptr};
}

tl::unexpected<Problem> notANumber(const Column& column) {
    return badValue(std::string(column.name) + " holds numbers",
                    "write the value as a whole number without quotes");
}

tl::unexpected<Problem> notAText(const Column& column) {
    return badValue(std::string(column.name) + " holds text", "write the value in quotes");
}

} // namespace

struct ConditionBuilder::Operator {
    std::string_view name;
    _IntfOper code;
    bool forNumbers; ///< true: for both kinds of columns; false: for character columns only
};

const std::array<ConditionBuilder::Operator, 10>& ConditionBuilder::operators() noexcept {
    static constexpr std::array<Operator, 10> operators = {{
        {"=", INTF_EQUAL, true},
        {"!=", INTF_NOT_EQUAL, true},
        {">=", INTF_GREATER_OR_EQUAL, true},
        {"<=", INTF_LESS_OR_EQUAL, true},
        {"<", INTF_LESS, true},
        {">", INTF_GREATER, true},
        {"contains", INTF_CONTAINS, false},
        {"starts", INTF_STARTS, false},
        {"matches", INTF_MATCHES, false},
        {"in", INTF_IN, true},
    }};
    return operators;
}

const ConditionBuilder::Operator* ConditionBuilder::findOperator(std::string_view op) noexcept {
    const auto* const found = std::find_if(operators().begin(), operators().end(),
                                           [&](const Operator& known) { return known.name == op; });
    return found == operators().end() ? nullptr : found;
}

std::string_view ConditionBuilder::nameOf(_IntfOper op) noexcept {
    const auto* const found = std::find_if(operators().begin(), operators().end(),
                                           [&](const Operator& known) { return known.code == op; });
    return found == operators().end() ? std::string_view() : found->name;
}

std::vector<std::string_view> ConditionBuilder::operatorNames() {
    std::vector<std::string_view> names;
    for (const Operator& known : operators()) {
        names.push_back(known.name);
    }
    return names;
}

ConditionBuilder::ConditionBuilder(std::string_view table)
    : m_columns(columnsOf(table)), m_hasFields(table == "RMLOGENT") {}

Result<const Column*> ConditionBuilder::column(std::string_view name) const {
    if (const Column* const column = findColumn(m_columns, name)) {
        return column;
    }
    const auto unknown = [&](std::string cure) {
        return refused(quoted(name) + " is not a column", std::move(cure), "column");
    };
    if (findColumn(m_columns, upperCase(name)) != nullptr) {
        return unknown("write it in upper case: " + upperCase(name));
    }
    std::string names;
    for (const Column& column : m_columns) {
        names += std::string(column.name) + (&column == &m_columns.back() ? "" : ", ");
    }
    names += m_hasFields ? ", and field.NAME for the fields of entries" : "";
    return unknown("the columns are " + names);
}

Result<Condition> ConditionBuilder::build(std::string_view columnName, std::string_view op,
                                          const ConditionValue& value,
                                          PatternBudget& budget) const {
    if (const auto field = fieldOf(columnName); field && m_hasFields) {
        return onField(*field, op, value, budget);
    }
    const Result<const Column*> found = column(columnName);
    if (!found) {
        return tl::unexpected(found.error());
    }
    const Column& column = **found;
    const Operator* const known = findOperator(op);
    if (known == nullptr) {
        return notAnOperator(op);
    }
    if (column.isNumber && !known->forNumbers) {
        return refused(std::string(column.name) + " holds numbers and '" + std::string(op) +
                           "' compares text",
                       "use =, !=, >=, <=, <, > or in", "op");
    }
    if (const Result<void> count = checkCount(known->code, op, value); !count) {
        return tl::unexpected(count.error());
    }
    return known->code == INTF_IN ? several(column, value) : single(column, *known, value, budget);
}

Result<Condition> ConditionBuilder::single(const Column& column, const Operator& op,
                                           const ConditionValue& value, PatternBudget& budget) {
    Condition condition;
    condition.column = column.name;
    condition.op = op.code;
    condition.isNumber = column.isNumber;
    const ConditionValue::Item& item = value.items.front();
    Result<void> checked;
    if (column.isNumber) {
        if (!std::holds_alternative<std::int64_t>(item)) {
            return notANumber(column);
        }
        condition.number = std::get<std::int64_t>(item);
        checked = checkNumber(condition.number);
    } else {
        if (!std::holds_alternative<std::string>(item)) {
            return notAText(column);
        }
        condition.text = std::get<std::string>(item);
        checked = op.forNumbers ? checkWhole(column, condition.text)
                                : budget.check(op.code, condition.text);
    }
    if (!checked) {
        return tl::unexpected(checked.error());
    }
    return condition;
}

Result<Condition> ConditionBuilder::several(const Column& column, const ConditionValue& value) {
    Condition condition;
    condition.column = column.name;
    condition.op = INTF_IN;
    condition.isNumber = column.isNumber;
    constexpr Operator equal{"=", INTF_EQUAL, true};
    PatternBudget noPatterns;
    for (const ConditionValue::Item& item : value.items) {
        Result<Condition> one = single(column, equal, {{item}, false}, noPatterns);
        if (!one) {
            return one;
        }
        condition.values.push_back(column.isNumber ? std::to_string(one->number)
                                                   : std::move(one->text));
    }
    if (const Result<void> checked = checkList(condition); !checked) {
        return tl::unexpected(checked.error());
    }
    return condition;
}

/// A condition on a field, which holds text and numbers: the value decides.
Result<Condition> ConditionBuilder::onField(std::string_view field, std::string_view op,
                                            const ConditionValue& value,
                                            PatternBudget& budget) const {
    const Operator* const known = findOperator(op);
    const auto isText = [](const ConditionValue::Item& item) {
        return std::holds_alternative<std::string>(item);
    };
    Result<void> checked = checkFieldName(field);
    if (checked && known == nullptr) {
        return notAnOperator(op);
    }
    checked = checked ? checkCount(known->code, op, value) : checked;
    if (!checked) {
        return tl::unexpected(checked.error());
    }
    Condition condition;
    condition.column = "field." + std::string(field);
    condition.op = known->code;
    condition.isNumber = !value.items.empty() && !isText(value.items.front());
    if (condition.isNumber && !known->forNumbers) {
        return badValue(quoted(op) + " compares text", "write the value in quotes");
    }
    for (const ConditionValue::Item& item : value.items) {
        if (isText(item) == condition.isNumber) {
            return badValue("the list has texts and numbers", "write all of its values in quotes");
        }
        condition.values.push_back(isText(item) ? std::get<std::string>(item) : numberText(item));
    }
    if (known->code == INTF_IN) {
        checked = checkList(condition);
    } else {
        condition.text = std::move(condition.values.front());
        condition.values.clear();
        if (!known->forNumbers) {
            checked = budget.check(condition.op, condition.text);
        } else if (condition.text.size() > longestPattern) {
            checked = badValue("the value has " + std::to_string(condition.text.size()) + " bytes",
                               "write at most " + std::to_string(longestPattern) + " bytes");
        }
    }
    if (!checked) {
        return tl::unexpected(checked.error());
    }
    return condition;
}

bool ConditionBuilder::isPlainFieldCharacter(char c) noexcept {
    constexpr std::string_view others = "=!<>~'\x7f";
    return static_cast<unsigned char>(c) > ' ' && others.find(c) == others.npos;
}

std::string ConditionBuilder::written(std::string_view column) {
    const auto field = fieldOf(column);
    if (!field || std::all_of(field->begin(), field->end(), &isPlainFieldCharacter)) {
        return std::string(column);
    }
    std::string text = "field.'";
    for (const char c : *field) {
        text += c == '\'' ? "''" : std::string(1, c);
    }
    return text + '\'';
}

Result<std::vector<Condition>> ConditionBuilder::ofLog(std::string_view path) {
    const bool isName = isSourceName(path);
    const std::size_t begin = isName ? 0 : path.rfind('/') + 1; // of the name
    if (!isName && (!path.starts_with('/') || begin == path.size())) {
        return badValue(quoted(path) + " is not the absolute path of a file",
                        "write the log's path as in the log configuration, beginning with '/'");
    }
    const std::string_view directory = path.substr(0, begin);
    const std::string_view name = path.substr(begin);
    const bool isAscii = std::all_of(path.begin(), path.end(),
                                     [](char c) { return static_cast<unsigned char>(c) < 0x80; });
    const std::span<const Column> columns = columnsOf("RMLOGENT");
    std::vector<Condition> conditions;
    for (const auto& [part, local, utf8] :
         {std::tuple{directory, "LOGPATH", "ULOGPATH"}, std::tuple{name, "LOGNAME", "ULOGNAME"}}) {
        const auto holds = [&columns, &part = part](const char* column) {
            return part.size() <= static_cast<std::size_t>(findColumn(columns, column)->width);
        };
        if (!holds(utf8)) {
            return badValue("the path is too long for a log's path", "shorten it");
        }
        Condition condition;
        condition.column = isAscii && holds(local) ? local : utf8;
        condition.text = part;
        conditions.push_back(std::move(condition));
    }
    return conditions;
}

} // namespace zrm::host
