#ifndef ZRM_TESTS_CONDITIONS_H
#define ZRM_TESTS_CONDITIONS_H

#include "host/framework/Condition.h"

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

inline Condition textCondition(std::string column, _IntfOper op, std::string text) {
    Condition condition;
    condition.column = std::move(column);
    condition.op = op;
    condition.text = std::move(text);
    return condition;
}

inline Condition numberCondition(std::string column, _IntfOper op, std::int64_t number) {
    Condition condition;
    condition.column = std::move(column);
    condition.op = op;
    condition.number = number;
    condition.isNumber = true;
    return condition;
}

inline Condition listCondition(std::string column, std::vector<std::string> values,
                               bool isNumber = false) {
    Condition condition;
    condition.column = std::move(column);
    condition.op = INTF_IN;
    condition.values = std::move(values);
    condition.isNumber = isNumber;
    return condition;
}

} // namespace zrm::host

#endif
