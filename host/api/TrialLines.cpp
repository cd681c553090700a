#include "host/api/TrialLines.h"

#include "host/diagnose/LastLines.h"
#include "host/diagnose/LogLedgers.h"
#include "host/diagnose/MonitoredLogFile.h"
#include "host/http/JsonFields.h"
#include "host/http/RequestRefused.h"

#include <cerrno>
#include <optional>
#include <utility>

namespace zrm::host {

std::vector<std::string> TrialLines::given(JsonFields& fields) {
    std::vector<std::string> lines = fields.texts("lines", most);
    for (std::size_t i = 0; i < lines.size(); ++i) {
        if (lines[i].size() > mostBytes) {
            throw RequestRefused(400, "write lines of at most 16384 bytes",
                                 fields.place("lines", i));
        }
        if (lines[i].find('\n') != std::string::npos) {
            throw RequestRefused(400, "write each line by itself, without its newline",
                                 fields.place("lines", i));
        }
    }
    return lines;
}

std::vector<std::string> TrialLines::ofLog(const JsonFields& fields, const std::string& log,
                                           std::size_t count) {
    const std::vector<LogLedgerView> monitored = LogLedgers::read(log);
    if (log.empty() || monitored.empty()) {
        fields.refuse("log", "this log is not monitored");
    }
    if (monitored[0].type != 'U' && monitored[0].type != 'S') {
        fields.refuse("log", "this log is not a text file");
    }
    const auto file = MonitoredLogFile::open(monitored[0].file, monitored[0].openFile);
    if (!file) {
        throw RequestRefused(409, {file.error().what, file.error().cure, fields.place("log")});
    }
    std::optional<std::vector<std::string>> lines = LastLines::read(file->descriptor(), count);
    if (!lines) {
        throw RequestRefused(409, because("the log cannot be read", errno), fields.place("log"));
    }
    return std::move(*lines);
}

} // namespace zrm::host
