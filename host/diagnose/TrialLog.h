#ifndef ZRM_HOST_TRIAL_LOG_H
#define ZRM_HOST_TRIAL_LOG_H

#include "logs/ValidLog.h"
#include "logtypes/UserLogFile.h"
#include "parser/StringParser.h"

#include <memory>
#include <string>
#include <utility>

namespace zrm::host {

/// A user log that nobody monitors: lines become rows as those of a monitored one do. One thread.
class TrialLog : public UserLogFile {
public:
    /// Takes a learned format.
    explicit TrialLog(std::unique_ptr<StringParser> format)
        : TrialLog(std::move(format), noLine()) {}

    const StringParser& format() const noexcept { return *SPAnchor; }

private:
    TrialLog(std::unique_ptr<StringParser> format, std::unique_ptr<ValidLog> line)
        : UserLogFile(*line, Unmonitored{}) {
        SPAnchor = std::move(format);
    }
    /// A configuration line that names no log.
    static std::unique_ptr<ValidLog> noLine();
};

} // namespace zrm::host

#endif
