#ifndef ZRM_HOST_EVENT_STREAM_H
#define ZRM_HOST_EVENT_STREAM_H

#include "host/history/EventFilter.h"
#include "host/http/HttpAnswer.h"
#include "host/http/HttpRequest.h"
#include "host/http/Resource.h"

#include <atomic>
#include <chrono>
#include <cstddef>
#include <memory>
#include <stop_token>

class HistoryReader;

/// `GET /api/v1/events/stream`: events as they are committed, as server-sent events. A client that
/// reads too slowly is disconnected and can go on where it was.
class EventStream : public Resource {
public:
    static constexpr std::size_t mostClients = 32;
    static constexpr std::chrono::seconds keepAlive{15};

    /// `history` outlives the object; null when the history is off. What tells a client that the
    /// stream is alive comes this often where there are no events.
    explicit EventStream(HistoryReader* history, std::chrono::milliseconds interval = keepAlive)
        : m_history(history), m_interval(interval) {}

    void addRoutes(Router& router) override;

    /// The number of clients that follow events now.
    std::size_t clients() const noexcept { return m_clients->load(); }

private:
    HttpAnswer open(const HttpRequest& request);
    void follow(EventFilter filter, const BodyWriter& write, const std::stop_token& stop) const;

    HistoryReader* const m_history;
    const std::chrono::milliseconds m_interval;
    /// Shared with the answers, which may end after the object.
    std::shared_ptr<std::atomic<std::size_t>> m_clients =
        std::make_shared<std::atomic<std::size_t>>(0);
};

#endif
