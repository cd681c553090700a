#include "TestLogs.h"

#include "base/ProcessValues.h"
#include "logs/ValidLog.h"

#include <cstring>

using namespace zrm;

namespace {

TestLogs* theLogs = nullptr;

/// An empty configuration line: a log without a name.
ValidLog namelessLog() {
    char line[] = "";
    return ValidLog(CONFIG_USER, line, nullptr);
}

std::unique_ptr<char[]> copyOf(const std::string& text) {
    auto copy = std::make_unique<char[]>(text.size() + 1);
    std::memcpy(copy.get(), text.c_str(), text.size() + 1);
    return copy;
}

} // namespace

// The process-wide values and the log manager, in place of the agent's.

decltype(pTheLogManager) zrm::pTheLogManager{nullptr};
char* zrm::gSystemName = nullptr;
char* zrm::gHostName = nullptr;
std::int32_t zrm::gMaxRows = 1000;

LogManager::LogManager() = default;
LogManager::~LogManager() = default;

void LogManager::beginRequest() {
    theLogs->calls.emplace_back("begin");
    NumLogs = static_cast<std::uint32_t>(static_cast<int>(theLogs->logs.size()) - theLogs->missing);
}

void LogManager::endRequest() {
    theLogs->calls.emplace_back("end");
}

void LogManager::setServerUp() {
    theLogs->calls.emplace_back("server up");
}

LogFile* LogManager::getNextLogObject(LogFile* current, unsigned index) {
    theLogs->calls.push_back("next " + std::to_string(index));
    const auto& logs = theLogs->logs;
    // The caller passes the last log returned and the number returned; both must agree.
    if (index == 0 ? current != nullptr : current != logs.at(index - 1).get()) {
        theLogs->calls.emplace_back("wrong walk");
    }
    return index < logs.size() ? logs[index].get() : nullptr;
}

LogFile* LogManager::findLogObject(const char* localName) {
    theLogs->calls.push_back(std::string("find ") + localName);
    for (const auto& log : theLogs->logs) {
        if (std::strcmp(log->fileNameLocal(), localName) == 0) {
            return log.get();
        }
    }
    return nullptr;
}

TestLogs::TestLogs() : m_manager(new LogManager) {
    theLogs = this;
    pTheLogManager = m_manager.get();
}

TestLogs::~TestLogs() {
    withdraw();
    theLogs = nullptr;
}

void TestLogs::withdraw() {
    pTheLogManager = nullptr;
}

TestLog& TestLogs::add(const std::string& name) {
    return *logs.emplace_back(std::make_unique<TestLog>(name));
}

TestLog::TestLog(const std::string& name) : LogFile(namelessLog(), nullptr), seen{} {
    setLocalName(name);
    setUTF8Name(name);
}

void TestLog::setLocalName(const std::string& name) {
    LogFileNameLocal = copyOf(name);
    LogPathNameLengthLocal = name.rfind('/') + 1;
}

void TestLog::setUTF8Name(const std::string& name) {
    LogFileNameUTF8 = copyOf(name);
    LogPathNameLengthUTF8 = name.rfind('/') + 1;
}

void TestLog::setNoName() {
    LogFileNameLocal.reset();
    LogFileNameUTF8.reset();
    LogPathNameLengthLocal = LogPathNameLengthUTF8 = 0;
}

void TestLog::setStatus(_MonitorStatus status, std::time_t changed) {
    MonitorStatus = status;
    MonitorStartStopTime = changed;
}

void TestLog::setCounts(std::int64_t events, std::int64_t errors) {
    NumEvents = events;
    NumFormatErrors = errors;
}

void* TestLog::startReportRequest(void* thresholds) {
    ++starts;
    seen = *static_cast<_RequestThresholds*>(thresholds);
    m_given = 0;
    return canReport ? this : nullptr;
}

void* TestLog::getNextLogEntry(void* row, void* reportState, void* thresholds) {
    ++asked;
    if (m_firstRow == nullptr) {
        m_firstRow = static_cast<char*>(row);
    }
    places.push_back(static_cast<char*>(row) - m_firstRow);
    const auto& window = *static_cast<_RequestThresholds*>(thresholds);
    if (reportState != this || std::memcmp(&window, &seen, sizeof seen) != 0 ||
        m_given == entries) {
        return nullptr;
    }
    auto* const entry = static_cast<zrm_rmlogent_data_t*>(row);
    std::memset(entry, ' ', sizeof *entry);
    fillCommonColumns(entry);
    std::memcpy(entry->entrytime, "1261120073000000", sizeof entry->entrytime);
    entry->rowno = m_given++;
    return row;
}

void TestLog::endReportRequest(void** reportState) {
    ++ends;
    if (*reportState == this) {
        *reportState = nullptr;
    }
}
