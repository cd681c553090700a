#ifndef ZRM_TESTS_LOG_MANAGER_FIXTURE_H
#define ZRM_TESTS_LOG_MANAGER_FIXTURE_H

#include "logmgr/LogManager.h"

#include "framework/trace.h"
#include "monitor/LogFile.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include <signal.h>

using namespace zrm;

/// A log manager over a configuration in a temporary directory, with the signals that it takes
/// blocked as start-up blocks them. Unless a test configures otherwise, all three environment
/// variables are unset.
class LogManagerFixture : public testing::Test {
protected:
    static constexpr const char* waiting = "Manager thread waiting for a signal.";

    LogManagerFixture();
    ~LogManagerFixture() override;

    /// Makes this text the log configuration, or the syslog configuration, with a modification
    /// time that differs from all earlier ones.
    void configure(const std::string& text);
    void configureSyslog(const std::string& text);
    /// Sets AGENT_DEBUG_LOG to this path.
    void setDebugLog(const std::string& path);

    /// Creates the manager and waits until it waits for a signal. Needs the detail class.
    void start();
    /// Sends SIGHUP and waits until the refresh is done. Needs the detail class.
    void refresh();
    /// The names of the manager's logs, in the order of the chain.
    std::vector<std::string> logs();
    /// A log that joins the chain without the manager's knowledge until it is destroyed.
    std::unique_ptr<LogFile> strangerBehind(LogFile* head);
    /// The recorded messages that begin with one of these texts.
    std::vector<std::string> messagesThatBegin(const std::vector<std::string>& beginnings) const;
    /// The recorded messages without state dumps, which begin with a newline.
    std::vector<std::string> messages() const;
    /// The debug log that the manager has opened for the logs, or null.
    static std::FILE* debugLogStream();
    static bool waitUntil(const std::function<bool()>& condition);

    TemporaryDirectory directory;
    const std::string config = directory.file("logs.conf");
    const std::string syslogConfig = directory.file("syslog.conf");
    const std::string a = directory.write("a.log", "");
    const std::string b = directory.write("b.log", "");
    const std::string c = directory.write("c.log", "");
    RecordingTrace trace{TRC1_DETAIL | TRC1_ERROR};
    std::unique_ptr<LogManager> manager;

private:
    void write(const std::string& path, const std::string& text);

    sigset_t m_previousMask;
    long m_changed = 1000000000; ///< modification time of the next configuration
};

/// Waits forever, on the initial thread of a death test's child that another thread ends.
[[noreturn]] void waitForEnd();

#endif
