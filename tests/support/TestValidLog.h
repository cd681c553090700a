#ifndef ZRM_TESTS_TEST_VALID_LOG_H
#define ZRM_TESTS_TEST_VALID_LOG_H

#include "logs/ValidLog.h"

#include <memory>
#include <stdexcept>
#include <string>

using namespace zrm;

/// The accepted configuration line of an existing file; `fields` are those behind the name, for
/// example " ;Y ;S".
inline std::unique_ptr<ValidLog> validLog(const std::string& path, const std::string& fields = "") {
    std::string line = path + fields;
    auto log = std::make_unique<ValidLog>(CONFIG_USER, line.data(), nullptr);
    if (!log->isValid()) {
        throw std::invalid_argument("refused: " + path + fields);
    }
    return log;
}

#endif
