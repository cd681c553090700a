#ifndef ZRM_HOST_REQUESTED_CHANGES_H
#define ZRM_HOST_REQUESTED_CHANGES_H

#include "host/base/Result.h"

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <deque>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

namespace zrm::host {

class HistoryFile;

/// Changes of the history that other threads ask for. The writer's thread makes them, between its
/// transactions.
class RequestedChanges {
public:
    /// Changes the file. May throw DatabaseError.
    using Change = std::function<void(HistoryFile&)>;

    /// How long a caller waits at most.
    static constexpr std::chrono::seconds patience{3};

    /// `wake` ends the wait of the writer's thread for events.
    explicit RequestedChanges(std::function<void()> wake) : m_wake(std::move(wake)) {}
    RequestedChanges(const RequestedChanges&) = delete;
    RequestedChanges& operator=(const RequestedChanges&) = delete;

    /// Waits until the change is stored; refused if it was not. A change for which there was no
    /// time in `longest` is not made later. Any thread but the writer's.
    Result<void> make(Change change, std::chrono::milliseconds longest = patience);

    // For the writer's thread.

    bool areWaiting() const;
    /// Makes the changes that are waiting, in the order of the requests. One that throws
    /// DatabaseError is refused, and the exception goes on.
    void run(HistoryFile& file);
    /// Refuses the changes that are waiting.
    void refuseAll(const std::string& why);
    /// Refuses those that are waiting and all that come. Any thread.
    void end();

private:
    struct Request {
        Change change;
        std::optional<Result<void>> result; ///< none: not made yet
    };
    using Shared = std::shared_ptr<Request>;

    Shared next();
    void answer(const Shared& request, Result<void> result);

    const std::function<void()> m_wake;
    mutable std::mutex m_mutex; ///< guards what follows and the requests' results
    std::condition_variable m_answered;
    std::deque<Shared> m_waiting;
    bool m_hasEnded = false;
};

} // namespace zrm::host

#endif
