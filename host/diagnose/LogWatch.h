#ifndef ZRM_HOST_LOG_WATCH_H
#define ZRM_HOST_LOG_WATCH_H

#include "host/diagnose/LogLedgerView.h"

#include <chrono>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

namespace zrm::host {

/// Looks at all monitored logs every few seconds and keeps the warnings about each, so that asking
/// for them never waits for a file system. The looking is done on a thread of its own, which knows
/// nothing of the agent's objects: one that a file system holds up for ever is left behind.
class LogWatch {
public:
    using Clock = std::chrono::steady_clock;
    static constexpr std::chrono::seconds interval{5};

    /// Given one line when a warning begins; called on the watch's thread.
    using Announce = std::function<void(const std::string&)>;

    explicit LogWatch(Announce announce);
    /// Does not wait for the thread.
    ~LogWatch();
    LogWatch(const LogWatch&) = delete;
    LogWatch& operator=(const LogWatch&) = delete;

    /// Begins a look when the last one is over and the interval has passed. `read` gives the logs;
    /// it is called only then. One thread.
    void tick(Clock::time_point now, const std::function<std::vector<LogLedgerView>()>& read);

    /// The warnings about one log, as the last look found them. Any thread.
    std::vector<LogWarning> of(const std::string& log) const;
    /// Those about all logs that have any. Any thread.
    std::map<std::string, std::vector<LogWarning>> all() const;

private:
    struct Shared;
    static void run(const std::shared_ptr<Shared>& shared);
    bool begin();

    std::shared_ptr<Shared> m_shared;
    bool m_hasThread = false;
    Clock::time_point m_next{};
};

} // namespace zrm::host

#endif
