#ifndef ZRM_TESTS_LOG_MANAGER_DOUBLE_H
#define ZRM_TESTS_LOG_MANAGER_DOUBLE_H

#include <cstdio>
#include <string>

/// Makes a log manager the process's that has nothing but a debug log: this file, opened for
/// appending and line-buffered. Without a path there is no debug log.
class LogManagerDouble {
public:
    explicit LogManagerDouble(const std::string& debugLog = "");
    ~LogManagerDouble();
    LogManagerDouble(const LogManagerDouble&) = delete;
    LogManagerDouble& operator=(const LogManagerDouble&) = delete;
};

#endif
