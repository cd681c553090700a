#ifndef ZRM_HOST_EVENT_STREAM_H
#define ZRM_HOST_EVENT_STREAM_H

#include "host/http/Message.h"
#include "host/http/Router.h"

#include <chrono>
#include <cstddef>
#include <memory>

namespace zrm::host {

class HistoryReader;

/// `GET /api/v1/events/stream`: events as they are committed, as server-sent events. One thread,
/// started for the first client, serves all of them and sends each as much as its connection takes.
/// A client that reads too slowly is disconnected and can continue where it was.
class EventStream : public Resource {
public:
    static constexpr std::size_t mostClients = 32;
    static constexpr std::chrono::seconds keepAlive{15};

    /// `history` outlives the object; null when the history is off. Without events, a keep-alive is
    /// sent this often.
    explicit EventStream(HistoryReader* history, std::chrono::milliseconds interval = keepAlive);
    /// Ends every stream.
    ~EventStream() override;
    EventStream(const EventStream&) = delete;
    EventStream& operator=(const EventStream&) = delete;

    void addRoutes(Router& router) override;

    /// The number of connected clients.
    std::size_t clients() const noexcept;

private:
    class Followers;

    HttpAnswer open(const HttpRequest& request);

    HistoryReader* const m_history;
    const std::shared_ptr<Followers> m_followers; ///< shared with the answers, which may end later
};

} // namespace zrm::host

#endif
