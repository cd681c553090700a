#ifndef ZRM_HOST_LOG_LEDGERS_H
#define ZRM_HOST_LOG_LEDGERS_H

#include "host/diagnose/LogLedgerView.h"

#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Reads the ledgers of the monitored logs. Stateless.
class LogLedgers {
public:
    /// The ledgers of all monitored logs in the order of the Monitored Logs table, or only that of
    /// the log with this path, including its rejected lines and skipped ranges; empty when it is
    /// not monitored. May wait for a refresh to end. Any thread, while the agent runs.
    static std::vector<LogLedgerView> read(std::string_view log = {});

    /// A ledger as a JSON object; `withSamples` adds "rejected" and "skipped".
    static std::string json(const LogLedgerView& ledger, bool withSamples);
};

} // namespace zrm::host

#endif
