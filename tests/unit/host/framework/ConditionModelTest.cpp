#include "host/base/Utf8.h"
#include "support/RecordingTrace.h"
#include "unit/host/framework/TestTable.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <memory>
#include <random>
#include <regex>

using namespace zrm::host;

// Random conditions on random rows, compared with the simplest implementation of their meaning.

namespace {

using Random = std::mt19937;

template <typename T, std::size_t N> const T& pick(Random& random, const T (&choices)[N]) {
    return choices[random() % N];
}

std::string randomText(Random& random, std::size_t maxSize) {
    // Few letters, so that equal and nearly equal texts are frequent.
    static const std::string pieces[] = {"a", "a", "b", " ", "B", "\t", "\xC3\xA9", "\x7f", "ab"};
    std::string text;
    const std::size_t size = random() % (maxSize + 1);
    while (text.size() < size) {
        text += pick(random, pieces);
    }
    // Characters are whole, as in all text that the agent converts.
    text = Utf8::prefix(text, maxSize);
    if (random() % 8 == 0) {
        text.insert(Utf8::prefix(text, random() % (text.size() + 1)).size(), 1, '\0');
    }
    return text;
}

constexpr _IntfOper relational[] = {INTF_EQUAL,         INTF_NOT_EQUAL, INTF_GREATER_OR_EQUAL,
                                    INTF_LESS_OR_EQUAL, INTF_LESS,      INTF_GREATER};
constexpr _IntfOper textual[] = {INTF_CONTAINS, INTF_STARTS, INTF_IN, INTF_MATCHES};
const std::string patterns[] = {"^a", "b$", "a.*b", "^$", "[aB]b", "a{2}", "^[^b]*$"};

Condition randomCondition(Random& random) {
    static const std::string texts[] = {"LOGPATH", "LOGNAME", "TEXT"};
    if (random() % 4 == 0) {
        return random() % 4 == 0
                   ? listCondition("NUMBER", {std::to_string(random() % 4), "-1"}, true)
                   : numberCondition("NUMBER", pick(random, relational),
                                     static_cast<int>(random() % 5) - 1);
    }
    const std::string column = pick(random, texts);
    if (random() % 2 == 0) {
        return textCondition(column, pick(random, relational), randomText(random, 36));
    }
    const _IntfOper op = pick(random, textual);
    if (op == INTF_IN) {
        return listCondition(column, {randomText(random, 4), randomText(random, 36)});
    }
    return textCondition(column, op,
                         op == INTF_MATCHES ? pick(random, patterns) : randomText(random, 3));
}

std::string trimmed(std::string text) {
    text = text.c_str();
    text.erase(text.find_last_not_of(' ') + 1);
    return text;
}

template <typename T> bool relationHolds(_IntfOper op, const T& left, const T& right) {
    switch (op) {
    case INTF_EQUAL:
        return left == right;
    case INTF_NOT_EQUAL:
        return left != right;
    case INTF_GREATER_OR_EQUAL:
        return left >= right;
    case INTF_LESS_OR_EQUAL:
        return left <= right;
    case INTF_LESS:
        return left < right;
    case INTF_GREATER:
        return left > right;
    }
    return false;
}

std::string cutTo(const std::string& column, std::string value, std::size_t width) {
    value = value.c_str();
    return column == "TEXT" ? std::string(Utf8::prefix(value, width)) : value.substr(0, width);
}

bool modelText(const Condition& condition, const std::string& field) {
    const std::string text = trimmed(field);
    const std::string value = condition.text.c_str();
    switch (static_cast<int>(condition.op)) {
    case static_cast<int>(INTF_CONTAINS):
        return text.find(value) != std::string::npos;
    case static_cast<int>(INTF_STARTS):
        return text.rfind(value, 0) == 0;
    case static_cast<int>(INTF_MATCHES):
        return std::regex_search(text, std::regex(value));
    case static_cast<int>(INTF_IN): {
        // A NUL ends the whole list.
        const std::string joined = condition.values[0] + '\n' + condition.values[1];
        std::string list = std::string(joined.c_str()) + '\n';
        while (!list.empty()) {
            const std::size_t end = list.find('\n');
            if (text == trimmed(cutTo(condition.column, list.substr(0, end), field.size()))) {
                return true;
            }
            list.erase(0, end + 1);
        }
        return false;
    }
    default: {
        std::string padded = text;
        std::string other = cutTo(condition.column, value, field.size());
        padded.resize(100, ' ');
        other.resize(100, ' ');
        return relationHolds(condition.op, padded, other);
    }
    }
}

bool model(const Condition& condition, const TestRow& row) {
    if (condition.column == "NUMBER") {
        return condition.op == INTF_IN
                   ? std::count(condition.values.begin(), condition.values.end(),
                                std::to_string(row.number)) > 0
                   : relationHolds(condition.op, std::int64_t{row.number}, condition.number);
    }
    if (condition.column == "LOGPATH") {
        return modelText(condition, std::string(row.logpath, sizeof row.logpath));
    }
    if (condition.column == "LOGNAME") {
        return modelText(condition, std::string(row.logname, sizeof row.logname));
    }
    return modelText(condition, std::string(row.text, sizeof row.text));
}

TEST(ConditionModel, RandomConditionsAgreeWithTheModel) {
    const char* const given = std::getenv("ZRM_TEST_SEED");
    const unsigned seed =
        given != nullptr ? static_cast<unsigned>(std::atol(given)) : std::random_device{}();
    SCOPED_TRACE("ZRM_TEST_SEED=" + std::to_string(seed));
    Random random(seed);
    RecordingTrace trace(0);
    TestManager manager;
    TestReceiver receiver;
    ContextInfo context{receiver};
    int held = 0;
    for (int round = 0; round < 4000; ++round) {
        RequestDetail detail;
        detail.conditions.resize(1 + random() % 3);
        std::generate(detail.conditions.begin(), detail.conditions.end(),
                      [&random] { return randomCondition(random); });
        TestRequest request(&detail, &context, &manager);
        for (int sample = 0; sample < 20; ++sample) {
            TestRow row(randomText(random, 16), randomText(random, 12), randomText(random, 32),
                        static_cast<int>(random() % 5) - 1);
            const bool expected =
                std::all_of(detail.conditions.begin(), detail.conditions.end(),
                            [&row](const Condition& condition) { return model(condition, row); });
            held += expected ? 1 : 0;
            ASSERT_EQ(request.CheckForException(row.bytes()) != 0, expected)
                << "round " << round << ": " << detail.conditions[0].column << ' '
                << detail.conditions[0].op << " '" << detail.conditions[0].text << "' of "
                << detail.conditions.size();
        }
    }
    EXPECT_GT(held, 2000);
}

} // namespace
