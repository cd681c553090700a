#include "logs/ValidLog.h"
#include "logs/zrm_rmlogent_data.h"
#include "logtypes/SysLogFile.h"
#include "require.h"

#include <cstdint>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <string_view>

#include <unistd.h>

using namespace zrm;

// Any line gives a row, in monitoring ("M" before the line) and in a report ("R"): its time is
// blank or ends in three zeros, its common columns are those of the log, and nothing outside the
// row and the line is touched.

namespace {

/// A log of an empty file; its monitor idles beside the fuzzing.
class Log {
public:
    Log() {
        m_path =
            std::filesystem::temp_directory_path() / ("fuzz-syslog-" + std::to_string(getpid()));
        std::ofstream(m_path).close();
        std::string line = m_path;
        const ValidLog valid(CONFIG_USER, line.data(), nullptr);
        m_log = std::make_unique<SysLogFile>(valid, nullptr);
    }
    ~Log() { std::filesystem::remove(m_path); }
    SysLogFile& get() { return *m_log; }
    std::string_view name() const { return std::string_view(m_path).substr(m_path.rfind('/') + 1); }

private:
    std::string m_path;
    std::unique_ptr<SysLogFile> m_log;
};

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static Log log;
    if (size == 0) {
        return 0;
    }
    const bool isReport = data[0] == 'R';
    // On the heap and of the exact size, where a step outside is found.
    const std::unique_ptr<char[]> line(new char[size]);
    std::memcpy(line.get(), data + 1, size - 1);
    line[size - 1] = '\0';
    const auto row = std::make_unique<zrm_rmlogent_data_t>();
    std::memset(row.get(), '#', sizeof *row);
    SyslogBufferInfo state{};
    std::memcpy(state.timestamp, "1060615120000000", sizeof state.timestamp);

    require(log.get().formatEntryAsRow(line.get(), row.get(), isReport ? &state : nullptr) == 0);

    require(std::memcmp(line.get(), data + 1, size - 1) == 0);
    const std::string_view time(row->entrytime, sizeof row->entrytime);
    const bool hasTime = time != "                ";
    require(!hasTime || time.substr(13) == "000");
    if (isReport && hasTime) {
        require(time == std::string_view(state.timestamp, sizeof state.timestamp));
        const bool isLater = time.substr(3, 4) > "0615";
        require(time.substr(0, 3) == (isLater ? "105" : "106"));
    }
    require(std::string_view(row->logname).substr(0, log.name().size()) == log.name());
    require(row->freqthresh == 0 && row->periodthrs == 0 && row->sampleno == 0 && row->rowno == 0);
    return 0;
}
