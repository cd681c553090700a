#include "logs/ValidLog.h"

#include "base/TraceScope.h"
#include "logs/FurtherLogs.h"
#include "logs/LogManagerUtil.h"

#include <cassert>
#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>
#include <string_view>

#include <sys/utsname.h>

namespace zrm {

namespace {

TRC1_Anchor anchor{"ValidLog.cpp"};

constexpr std::string_view logTypes = "SEAU";
constexpr std::string_view typesWithProcedure = "EU";
constexpr std::string_view nameToken = "${@}"; ///< replaced with the log's name in a procedure

// The fields of a configuration line by number.
constexpr int fileNameField = 1;
constexpr int debugModeField = 2;
constexpr int typeField = 3;
constexpr int procedureField = 4;
constexpr int fieldCount = 4;

char upperCase(char letter) {
    return static_cast<char>(std::toupper(static_cast<unsigned char>(letter)));
}

/// Splits a line at tabs and blanks, in place.
class Tokens {
public:
    explicit Tokens(char* line) : m_rest(line) {}

    /// The next token, terminated, or null at the end of the line.
    char* next() {
        char* const token = m_rest + std::strspn(m_rest, separators);
        if (*token == '\0') {
            m_rest = token;
            return nullptr;
        }
        m_end = token + std::strcspn(token, separators);
        m_rest = m_end;
        if (*m_end != '\0') {
            *m_end = '\0';
            ++m_rest;
        }
        return token;
    }

    /// Appends a blank and the rest of the line to the last token.
    void takeRest() {
        if (*m_rest != '\0') {
            *m_end = ' ';
            m_rest += std::strlen(m_rest);
        }
    }

private:
    static constexpr const char* separators = "\t ";
    char* m_rest;          ///< the part not split yet
    char* m_end = nullptr; ///< the last token's terminator
};

} // namespace

ValidLog::ValidLog(WhenceConfig whence, char* line, ValidLog* head) {
    TraceScope trace(anchor);
    switch (whence) {
    case CONFIG_DEFAULT:
        extractFileName(line);
        break;
    case CONFIG_USER:
        extractTokens(line);
        break;
    default:
        trace.error()("Constructor invoked with invalid argument: %d", static_cast<int>(whence));
        Valid = false;
        break;
    }
    if (Valid && head != nullptr) {
        checkForDups(head);
    }
    if (Valid) {
        addToChain(head);
        if (trace.isOn(TRC1_FINE)) {
            printSelf();
        }
    }
}

ValidLog::ValidLog(const FurtherLog& log) {
    TraceScope trace(anchor);
    addToChain(nullptr);
    LogType = log.type;
    LogDebugMode.store(log.debugMode, std::memory_order_relaxed);
    LogFollowSettings = log.settings;
    if (isSource()) {
        setSourceName(log.name.c_str());
        return;
    }
    setLogFileName(log.name.c_str(), 1);
    Valid = log.name.starts_with('/') && LogPathNameLengthLocal != 0 && isNameUsable(trace, 1);
    if (!log.procedure.empty()) {
        setLogProcedure(log.procedure.c_str());
    }
}

ValidLog::~ValidLog() {
    TraceScope trace(anchor);
    if (Valid) {
        removeFromChain();
    }
}

void ValidLog::extractTokens(char* line) {
    TraceScope trace(anchor);
    Tokens tokens(line);
    char* token = nullptr;
    for (int field = fileNameField; Valid && (token = tokens.next()) != nullptr; ++field) {
        if (!hasSeparatorAsNeeded(trace, field, token)) {
            Valid = false;
        } else if (field == fileNameField) {
            takeFileName(trace, token);
        } else if (token[1] != '\0') { // else the field keeps its default
            if (field == procedureField) {
                tokens.takeRest();
            }
            takeField(trace, field, token + 1);
        }
    }
    // A log of type 'U' or 'E' without a procedure is valid here. Its monitor decides what to do
    // about it.
}

/// True if the token begins with ';' exactly where it must.
bool ValidLog::hasSeparatorAsNeeded(const TraceScope& trace, int field, const char* token) const {
    const bool isSeparated = *token == ';';
    if (field == fileNameField) {
        if (isSeparated) {
            trace.error()("File name cannot be defaulted. Skipping rest of line.");
        }
        return !isSeparated;
    }
    if (!isSeparated) {
        // The message shows the length of the log's path in place of its name.
        char pathLength[24];
        std::snprintf(pathLength, sizeof pathLength, "%zu", LogPathNameLengthUTF8);
        trace.error()("Field separator missing after field %d for log %s. Skipping rest of line.",
                      field - 1, pathLength);
    }
    return isSeparated;
}

void ValidLog::takeField(const TraceScope& trace, int field, const char* token) {
    switch (field) {
    case debugModeField:
        LogDebugMode.store(upperCase(*token) == 'Y' ? 'Y' : 'N', std::memory_order_relaxed);
        break;
    case typeField:
        takeType(trace, token);
        break;
    case procedureField:
        takeProcedure(trace, token);
        break;
    default:
        trace.error()("Field %d for log %s is out of bounds. Maximum number of fields is %d. "
                      "Value of %s is ignored",
                      field, fileNameLocal(), fieldCount, token);
        break;
    }
}

void ValidLog::takeFileName(const TraceScope& trace, const char* token) {
    if (*token != '/') {
        trace.error()("Absolute path name of log file must be specified for log %s. "
                      "Ignoring remainder of line.",
                      fileNameLocal());
        Valid = false;
    } else if (LogManagerUtil::fileLastModified(token) == 0) {
        trace.error()("Ignoring remainder of line.");
        Valid = false;
    } else {
        setLogFileName(token, 1);
        Valid = LogPathNameLengthLocal != 0 && isNameUsable(trace, 1);
    }
}

/// A name altered by its conversion would denote a different file.
bool ValidLog::isNameUsable(const TraceScope& trace, int isUTF8) const {
    const bool isUsable = isNameKept(isUTF8);
    if (!isUsable) {
        trace.error()("The name of file %s is not kept by a conversion between UTF-8 and the local "
                      "code page. Ignoring remainder of line.",
                      isUTF8 == 1 ? fileNameUTF8() : fileNameLocal());
    }
    return isUsable;
}

void ValidLog::takeType(const TraceScope& trace, const char* token) {
    const char type = upperCase(*token);
    if (logTypes.find(type) == std::string_view::npos) {
        trace.error()("Log type of %s for log %s is invalid. Ignoring remainder of line.", token,
                      fileNameLocal());
        Valid = false;
    } else if (type == 'E' && !isErrorLogSystem(trace)) {
        trace.error()("Errlogs are valid only on AIX.  Ignoring line.");
        Valid = false;
    } else {
        LogType = type;
    }
}

/// True on the one system that has an error log, and if the system cannot be determined.
bool ValidLog::isErrorLogSystem(const TraceScope& trace) const {
    utsname names;
    if (::uname(&names) < 0) {
        trace.error()("uname call failed. Ignoring test for errlogs only on AIX.");
        return true;
    }
    trace.detail()("sysname: %s", names.sysname);
    return std::strcmp(names.sysname, "AIX") == 0;
}

void ValidLog::takeProcedure(const TraceScope& trace, const char* procedure) {
    if (typesWithProcedure.find(LogType) == std::string_view::npos) {
        trace.error()("Procedure parameter %s not valid for file %s which is of type %c; "
                      "parameter ignored. ",
                      procedure, fileNameLocal(), LogType);
        return;
    }
    setLogProcedure(procedure);
}

void ValidLog::extractFileName(char* line) {
    TraceScope trace(anchor);
    Valid = false;
    Tokens tokens(line);
    const char* const selector = tokens.next();
    const char* const action = selector != nullptr ? tokens.next() : nullptr;
    if (action == nullptr) {
        trace.detail()("syslog line discarded. Expected format is: "
                       "'facility.priority[;facility.priority]', one or more tabs or spaces "
                       "followed by an absolute file name.");
        return;
    }
    // Actions such as remote hosts and user lists are not logs.
    if (*action != '/' || LogManagerUtil::fileLastModified(action) == 0) {
        return;
    }
    setLogFileName(action, 2);
    Valid = LogPathNameLengthLocal != 0 && isNameUsable(trace, 2);
}

void ValidLog::checkForDups(const ValidLog* head) {
    TraceScope trace(anchor);
    const ValidLog* log = head;
    do {
        if (std::strcmp(fileNameLocal(), log->fileNameLocal()) == 0) {
            trace.error()("Duplicate %s entry found; entry ignored.", fileNameLocal());
            Valid = false;
            return;
        }
        log = log->next();
    } while (log != head);
}

void ValidLog::setLogProcedure(const char* procedure) {
    TraceScope trace(anchor);
    std::size_t occurrences = 0;
    for (std::string_view rest = procedure; rest.find(nameToken) != std::string_view::npos;
         rest.remove_prefix(rest.find(nameToken) + nameToken.size())) {
        ++occurrences;
    }
    if (occurrences == 0) {
        LogBase::setLogProcedure(procedure);
        return;
    }
    const std::string_view logName = fileNameLocal();
    const std::size_t size =
        std::strlen(procedure) + occurrences * logName.size() - occurrences * nameToken.size() + 1;
    const std::unique_ptr<char[]> substituted(new (std::nothrow) char[size]());
    if (!substituted) {
        trace.error()("Memory allocation of %d bytes failed. Agent is terminating.",
                      static_cast<int>(size));
        std::exit(-1);
    }
    char* pDest = substituted.get();
    [[maybe_unused]] const char* const pLastByte = pDest + size - 1;
    std::string_view rest = procedure;
    for (std::size_t numChars = rest.find(nameToken); numChars != std::string_view::npos;
         numChars = rest.find(nameToken)) {
        assert((pDest + numChars - 1) < pLastByte);
        pDest += rest.copy(pDest, numChars);
        assert((pDest + logName.size() - 1) < pLastByte);
        pDest += logName.copy(pDest, logName.size());
        rest.remove_prefix(numChars + nameToken.size());
    }
    rest.copy(pDest, rest.size());
    LogBase::setLogProcedure(substituted.get());
}

void ValidLog::printSelf() const {
    TraceScope trace(anchor);
    LogBase::printSelf();
    trace.always()("\n\tValid\t\t\t= %d\n", static_cast<int>(Valid));
}

} // namespace zrm
