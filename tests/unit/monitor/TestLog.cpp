#include "TestLog.h"

#include "base/ProcessValues.h"

#include <algorithm>
#include <chrono>
#include <cstring>
#include <thread>

using namespace zrm;

namespace {

char systemName[65] = "web1:ZRM";

} // namespace

long TestLog::formatEntryAsRow(char* entry, void* row, void* /*context*/) {
    lines.emplace_back(entry);
    if (onLine) {
        onLine(lines.back());
    }
    if (std::strncmp(entry, "bad", 3) == 0) {
        return -1;
    }
    auto& columns = *static_cast<zrm_rmlogent_data_t*>(row);
    std::memset(row, ' ', sizeof columns);
    std::memcpy(columns.entrydesc, entry, std::min(std::strlen(entry), sizeof columns.entrydesc));
    fillCommonColumns(&columns);
    return 0;
}

void TestLog::processLogData() {
    openLogAndSeek();
    if (LogFileP != nullptr) {
        waitForEventLoop(timeval{0, 1000});
        if (closes) {
            closeLog();
        }
    }
}

long TestLog::readLog() {
    const long result = LogFile::readLog();
    if (afterReading) {
        afterReading();
    }
    return result;
}

void TestLog::follow() {
    setMonitorStatus(MONITOR_RUNNING);
    waitForEventLoop(timeval{0, 1000});
}

std::string TestLog::statusText() const {
    char text[64];
    std::memset(text, '\0', sizeof text);
    getMonitorStatus(text, sizeof text);
    return text;
}

MonitoredFile::MonitoredFile() {
    LocaleDouble::reset();
    EventRecorder::clear();
    gSystemName = systemName;
}

MonitoredFile::~MonitoredFile() {
    gSystemName = nullptr;
}

bool waitUntil(const std::function<bool()>& condition) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    while (!condition()) {
        if (std::chrono::steady_clock::now() > deadline) {
            return false;
        }
        std::this_thread::sleep_for(std::chrono::microseconds(100));
    }
    return true;
}

std::string exactly(const std::string& text) {
    std::string pattern = "^";
    for (const char letter : text) {
        if (std::strchr("\\^$.|?*+()[]{}", letter) != nullptr) {
            pattern += '\\';
        }
        pattern += letter;
    }
    return pattern + "\n$";
}
