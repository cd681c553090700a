#include "host/diagnose/TrialLog.h"

#include "logs/ValidLog.h"

namespace zrm::host {

std::unique_ptr<ValidLog> TrialLog::noLine() {
    char line[] = "";
    return std::make_unique<ValidLog>(CONFIG_USER, line, nullptr);
}

} // namespace zrm::host
