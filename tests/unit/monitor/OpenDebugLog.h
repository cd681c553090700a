#ifndef ZRM_TESTS_OPEN_DEBUG_LOG_H
#define ZRM_TESTS_OPEN_DEBUG_LOG_H

#include "monitor/LogFile.h"

#include <cstdio>
#include <string>

using namespace zrm;

/// The debug log of all logs while the object lives: this file, opened for appending and
/// line-buffered.
class OpenDebugLog {
public:
    explicit OpenDebugLog(const std::string& path) : m_stream(std::fopen(path.c_str(), "a")) {
        std::setvbuf(m_stream, nullptr, _IOLBF, BUFSIZ);
        LogFile::setDebugLog(m_stream);
    }
    ~OpenDebugLog() {
        LogFile::setDebugLog(nullptr);
        std::fclose(m_stream);
    }
    OpenDebugLog(const OpenDebugLog&) = delete;
    OpenDebugLog& operator=(const OpenDebugLog&) = delete;

private:
    std::FILE* m_stream;
};

#endif
