#ifndef ZRM_TESTS_SYSLOG_TEST_H
#define ZRM_TESTS_SYSLOG_TEST_H

#include "logtypes/SysLogFile.h"

#include "base/ProcessValues.h"
#include "support/EventRecorder.h"
#include "support/Faults.h"
#include "support/LocaleDouble.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "support/TestValidLog.h"
#include "support/TimeZone.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <memory>
#include <string>
#include <thread>

using namespace zrm;

/// A syslog file whose monitor could not open it and has ended, so that a test has the object to
/// itself and need not wait for a check of the file. The time is 5 October 2006, 12:00:00 UTC.
class SyslogTest : public testing::Test {
protected:
    static constexpr std::time_t noon = 1160049600;

    SyslogTest() {
        LocaleDouble::reset();
        EventRecorder::clear();
        gSystemName = m_systemName;
        const Fault fault("open", EACCES);
        m_log = std::make_unique<SysLogFile>(*m_line, nullptr);
        while (m_log->monitorStatus() == MONITOR_RUNNING) {
            std::this_thread::yield();
        }
    }
    ~SyslogTest() override { gSystemName = nullptr; }

    TimeZone m_zone{"UTC0"};
    FakeClock m_clock{noon};
    char m_systemName[65] = "web1:ZRM";
    TemporaryDirectory m_directory;
    std::string m_path = m_directory.write("messages", "");
    std::unique_ptr<ValidLog> m_line = validLog(m_path, " ;N ;S");
    std::unique_ptr<SysLogFile> m_log;
};

#endif
