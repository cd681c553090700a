#ifndef ZRM_TESTS_LOG_TABLES_H
#define ZRM_TESTS_LOG_TABLES_H

#include "ConfigText.h"

#include <string>
#include <vector>

/// The [[log]] tables of a text that must be valid.
inline std::vector<LogConfig> logsOf(const std::string& text) {
    return accepted(text).logs;
}

#endif
