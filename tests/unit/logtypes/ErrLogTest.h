#ifndef ZRM_TESTS_ERR_LOG_TEST_H
#define ZRM_TESTS_ERR_LOG_TEST_H

#include "LogTypeTest.h"
#include "logtypes/ErrLogFile.h"
#include "support/TestValidLog.h"
#include "support/TimeZone.h"

#include <cerrno>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include <sys/wait.h>

using namespace zrm;

/// What the tests of the error log share. The system calls itself AIX, because no other accepts
/// the configuration line.
class ErrLogTest : public LogTypeTest {
protected:
    static constexpr const char* header = "IDENTIFIER TIMESTAMP  T C RESOURCE_NAME  DESCRIPTION\n";
    static constexpr const char* entry =
        "A924A5FC   1004030306 P S SYSPROC        SOFTWARE PROGRAM ABNORMALLY TERMINATED\n";
    static constexpr const char* otherEntry =
        "BFE4C025   1231235999 T H sysplanar0     UNDETERMINED ERROR\n";

    /// The configuration line of an error log that is read through `command`.
    std::unique_ptr<ValidLog> line(const std::string& command) const {
        return validLog(log, command.empty() ? " ;N ;E" : " ;N ;E ;" + command);
    }
    std::unique_ptr<ErrLogFile> start(const std::string& command) const {
        return std::make_unique<ErrLogFile>(*line(command), nullptr);
    }
    /// A command that writes this text and ends.
    std::string printing(const std::string& text) const {
        return "cat " + directory.write("output", text);
    }

    /// The first number that follows `text` in the messages so far, or -1.
    int numberAfter(const std::string& text) const {
        for (const std::string& message : trace.messages()) {
            const std::size_t found = message.find(text);
            if (found != std::string::npos) {
                return std::atoi(message.c_str() + found + text.size());
            }
        }
        return -1;
    }
    /// The process id of the last child started, from the detail class.
    int childId() const { return numberAfter(log + ". pid = "); }

    /// The messages with every process id and descriptor replaced by N.
    static std::vector<std::string> masked(std::vector<std::string> messages) {
        for (std::string& message : messages) {
            for (const char* const before :
                 {"pid = ", "fd = ", "fd ", "pipe ", "process ", "fd's ", "& "}) {
                maskNumbers(message, before);
            }
        }
        return messages;
    }
    std::vector<std::string> errors() const { return masked(trace.messages()); }
    std::string endOfOutput(const std::string& command) const {
        return "EOF detected during fgets() system call on pipe N to command " + command + ".";
    }

    static void maskNumbers(std::string& message, std::string_view before) {
        for (std::size_t at = message.find(before); at != std::string::npos;
             at = message.find(before, at)) {
            at += before.size();
            const std::size_t end = message.find_first_not_of("0123456789", at);
            if (end > at && at < message.size()) {
                message.replace(at, (end == std::string::npos ? message.size() : end) - at, "N");
            }
        }
    }

    static int openDescriptors() {
        const std::filesystem::directory_iterator all("/proc/self/fd");
        return static_cast<int>(std::distance(begin(all), end(all)));
    }
    /// True if this process has no child, running or ended.
    static bool hasNoChild() { return waitpid(-1, nullptr, WNOHANG) == -1 && errno == ECHILD; }

    // Stopping a monitor whose command is silent takes as long as its wait for data.
    std::optional<ShortSelect> shortSelect{std::in_place};
    const FakeUname system{"AIX"};
    const TimeZone zone{"UTC0"};
    const std::string log = directory.write("errlog", "");
};

#endif
