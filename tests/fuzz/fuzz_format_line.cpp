#include "base/ProcessValues.h"
#include "logs/ValidLog.h"
#include "logs/zrm_rmlogent_data.h"
#include "logtypes/UserLogFile.h"

#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include <unistd.h>

using namespace zrm;

// Lines of user logs: each input is a line, tried with logs of several formats while monitoring
// and in a report. Every row must be whole: a time stamp of 16 characters or no row.

namespace {

constexpr const char* formats[] = {
    R"(A,"%4d-%2d-%2dT%2d:%2d:%2d%*[^ ] %s %[^:]: %[^\n]",)"
    "year month day hour minute second type source description",
    R"(A,"%s %d %[^:]:%d:%f %5c %(30)s %hd %x %lf %Lg",)"
    "month day hour minute second class system type = \"%05hd\" source = \"%#X\" "
    "description = \"%'12.3lf\" description = \" %Lg\"",
    R"(A,"%[^\n]",description)",
    R"(A,"%(1)7c%(1)7c%(1)7c%(1)7c%(1)7c%(1)7c",year month day hour minute second)",
};

/// The logs, of one file; each has learned its format.
std::vector<std::unique_ptr<UserLogFile>>& logs() {
    static auto* const theLogs = [] {
        static char systemName[65] = "fuzz:ZRM";
        gSystemName = systemName;
        char path[] = "/tmp/zrm-fuzz-XXXXXX";
        const int fd = mkstemp(path);
        if (fd < 0) {
            std::abort();
        }
        close(fd);
        auto* const made = new std::vector<std::unique_ptr<UserLogFile>>;
        for (const char* format : formats) {
            std::string line = std::string(path) + " ;N ;U ;" + format;
            const ValidLog configuration(CONFIG_USER, line.data(), nullptr);
            made->push_back(std::make_unique<UserLogFile>(configuration, nullptr));
        }
        for (const auto& log : *made) {
            log->stopThread(); // learning comes first
            if (log->monitorStatus() != MONITOR_STOPPED) {
                std::abort();
            }
        }
        unlink(path);
        return made;
    }();
    return *theLogs;
}

void format(UserLogFile& log, const std::string& text, void* context) {
    std::string line = text.c_str();
    const auto row = std::make_unique<zrm_rmlogent_data_t>();
    if (log.formatEntryAsRow(line.data(), row.get(), context) != 0) {
        return;
    }
    for (const char character : row->entrytime) {
        if ((character < '0' || character > '9') && character != '-') {
            std::abort();
        }
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string text(reinterpret_cast<const char*>(data), size);
    for (const auto& log : logs()) {
        UserlogBufferInfo context{};
        context.century = 1;
        context.month = 3;
        context.day = 4;
        format(*log, text, nullptr);
        format(*log, text, &context);
    }
    return 0;
}
