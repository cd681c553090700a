#ifndef ZRM_TESTS_LOG_TYPE_TEST_H
#define ZRM_TESTS_LOG_TYPE_TEST_H

#include "DebugLogRecorder.h"
#include "base/ProcessValues.h"
#include "logs/RequestThresholds.h"
#include "monitor/LogFile.h"
#include "support/EventRecorder.h"
#include "support/Faults.h"
#include "support/LocaleDouble.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdio>
#include <functional>
#include <string>
#include <thread>

using namespace zrm;

/// What the tests of the log types share: a directory, doubles that remember, and the agent's
/// names.
class LogTypeTest : public testing::Test {
protected:
    LogTypeTest() {
        EventRecorder::clear();
        DebugLogRecorder::clear();
        LocaleDouble::reset();
        static char systemName[] = "web1:ZRM";
        static char hostName[] = "web1.example.org";
        gSystemName = systemName;
        gHostName = hostName;
    }
    ~LogTypeTest() override {
        gSystemName = nullptr;
        gHostName = nullptr;
    }

    static std::string statusText(const LogFile& log) {
        char text[64];
        log.getMonitorStatus(text, sizeof text);
        return {text, std::string(monitorStatusText(log.monitorStatus())).size()};
    }

    /// Waits until the condition holds; false after the time limit.
    static bool waitUntil(const std::function<bool()>& condition, int seconds = 10) {
        const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(seconds);
        while (!condition()) {
            if (std::chrono::steady_clock::now() > limit) {
                return false;
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        return true;
    }
    static bool waitForStatus(const LogFile& log, _MonitorStatus status) {
        return waitUntil([&] { return log.monitorStatus() == status; });
    }

    /// The open descriptors of a program that this process starts now.
    static std::string openFilesOfAChild() {
        std::string listing;
        std::FILE* const stream = popen("ls -l /proc/self/fd", "re");
        char text[4096];
        while (const std::size_t count = std::fread(text, 1, sizeof text, stream)) {
            listing.append(text, count);
        }
        pclose(stream);
        return listing;
    }

    /// A report's window. An empty text means that there is no such time.
    static _RequestThresholds window(const char* start, const char* end) {
        _RequestThresholds thresholds{};
        std::snprintf(thresholds.startTime, sizeof thresholds.startTime, "%s", start);
        std::snprintf(thresholds.endTime, sizeof thresholds.endTime, "%s", end);
        return thresholds;
    }

    TemporaryDirectory directory;
    RecordingTrace trace{TRC1_ERROR};
};

#endif
