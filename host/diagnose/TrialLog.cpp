#include "host/diagnose/TrialLog.h"

#include "logs/ValidLog.h"

std::unique_ptr<ValidLog> TrialLog::noLine() {
    char line[] = "";
    return std::make_unique<ValidLog>(CONFIG_USER, line, nullptr);
}
