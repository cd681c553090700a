#include "LogManagerFixture.h"

#include "AgentDoubles.h"
#include "logtypes/createLogFile.h"
#include "support/LocaleDouble.h"

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <fstream>
#include <thread>

#include <unistd.h>
#include <utime.h>

using namespace zrm;

LogManagerFixture::LogManagerFixture() {
    LocaleDouble::reset();
    AgentDoubles::reset();
    sigset_t signals;
    sigemptyset(&signals);
    for (const int number : {SIGCHLD, SIGHUP, SIGINT, SIGTERM, SIGQUIT}) {
        sigaddset(&signals, number);
    }
    pthread_sigmask(SIG_BLOCK, &signals, &m_previousMask);
}

LogManagerFixture::~LogManagerFixture() {
    manager.reset();
    unsetenv("ZRM_CONFIG_FILE");
    unsetenv("ZRM_SYSLOG_CONF");
    unsetenv("AGENT_DEBUG_LOG");
    // A signal that the manager did not consume must not reach the test program.
    sigset_t pending;
    while (sigpending(&pending) == 0 && sigismember(&pending, SIGHUP) == 1) {
        sigset_t hangup;
        sigemptyset(&hangup);
        sigaddset(&hangup, SIGHUP);
        int taken = 0;
        sigwait(&hangup, &taken);
    }
    pthread_sigmask(SIG_SETMASK, &m_previousMask, nullptr);
}

void LogManagerFixture::write(const std::string& path, const std::string& text) {
    std::ofstream(path) << text;
    const utimbuf times{m_changed, m_changed};
    utime(path.c_str(), &times);
    ++m_changed;
}

void LogManagerFixture::configure(const std::string& text) {
    write(config, text);
    setenv("ZRM_CONFIG_FILE", config.c_str(), 1);
    setenv("ZRM_SYSLOG_CONF", syslogConfig.c_str(), 1);
}

void LogManagerFixture::configureSyslog(const std::string& text) {
    write(syslogConfig, text);
    setenv("ZRM_SYSLOG_CONF", syslogConfig.c_str(), 1);
}

void LogManagerFixture::setDebugLog(const std::string& path) {
    setenv("AGENT_DEBUG_LOG", path.c_str(), 1);
}

void LogManagerFixture::start() {
    manager = std::make_unique<LogManager>();
    ASSERT_TRUE(trace.waitFor(waiting));
}

void LogManagerFixture::refresh() {
    trace.clear();
    kill(getpid(), SIGHUP);
    ASSERT_TRUE(trace.waitFor(waiting));
}

std::vector<std::string> LogManagerFixture::logs() {
    std::vector<std::string> names;
    manager->beginRequest();
    LogFile* log = nullptr;
    while ((log = manager->getNextLogObject(log, static_cast<unsigned>(names.size()))) != nullptr) {
        names.emplace_back(log->fileNameLocal());
    }
    manager->endRequest();
    return names;
}

std::unique_ptr<LogFile> LogManagerFixture::strangerBehind(LogFile* head) {
    std::string line = c;
    const ValidLog log(CONFIG_USER, line.data(), nullptr);
    return std::unique_ptr<LogFile>(createLogFile(log, head));
}

std::vector<std::string>
LogManagerFixture::messagesThatBegin(const std::vector<std::string>& beginnings) const {
    std::vector<std::string> chosen;
    for (const std::string& message : trace.messages()) {
        if (std::any_of(beginnings.begin(), beginnings.end(), [&](const std::string& beginning) {
                return message.starts_with(beginning);
            })) {
            chosen.push_back(message);
        }
    }
    return chosen;
}

std::vector<std::string> LogManagerFixture::messages() const {
    std::vector<std::string> all = trace.messages();
    std::erase_if(all, [](const std::string& message) { return message.starts_with('\n'); });
    return all;
}

std::FILE* LogManagerFixture::debugLogStream() {
    class Log : public LogFile {
    public:
        using LogFile::m_debugLog;
    };
    return Log::m_debugLog;
}

bool LogManagerFixture::waitUntil(const std::function<bool()>& condition) {
    const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    while (!condition()) {
        if (std::chrono::steady_clock::now() > limit) {
            return false;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    return true;
}

void waitForEnd() {
    for (;;) {
        pause();
    }
}
