#ifndef ZRM_HOST_LOG_WATCH_H
#define ZRM_HOST_LOG_WATCH_H

#include "host/diagnose/LogLedgers.h"

#include <chrono>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// Checks all monitored logs every few seconds and keeps the warnings about each, so that reading
/// them never blocks on a file system. The checks run on their own thread, which uses none of the
/// agent's objects: a thread that a file system blocks forever is abandoned.
class LogWatch {
public:
    using Clock = std::chrono::steady_clock;
    static constexpr std::chrono::seconds interval{5};

    /// Called with one line when a warning begins, on the watch's thread.
    using Announce = std::function<void(const std::string&)>;

    explicit LogWatch(Announce announce);
    /// Does not wait for the thread.
    ~LogWatch();
    LogWatch(const LogWatch&) = delete;
    LogWatch& operator=(const LogWatch&) = delete;

    /// Starts a check if the last one is over and the interval has passed. `read` returns the logs,
    /// with the warnings that are known already; it is called only then. Used by one thread.
    void tick(Clock::time_point now, const std::function<std::vector<LogLedgerView>()>& read);

    /// The warnings about one log from the last check. Any thread.
    std::vector<LogWarning> of(const std::string& log) const;
    /// How a followed log was doing at the last check; none for any other. Any thread.
    std::optional<LogHealth> healthOf(const std::string& log) const;
    /// The warnings about all logs that have any. Any thread.
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
