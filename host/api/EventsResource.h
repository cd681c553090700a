#ifndef ZRM_HOST_EVENTS_RESOURCE_H
#define ZRM_HOST_EVENTS_RESOURCE_H

#include "host/http/Message.h"
#include "host/http/Router.h"

namespace zrm::host {

class HistoryReader;

/// The contents of the history: `GET /api/v1/events`, `GET /api/v1/events/{id}` and `GET
/// /api/v1/rates`.
class EventsResource : public Resource {
public:
    /// `history` must outlive the object; null when the history is off.
    explicit EventsResource(HistoryReader* history) : m_history(history) {}

    void addRoutes(Router& router) override;

private:
    HttpAnswer events(const HttpRequest& request);
    HttpAnswer event(const HttpRequest& request);
    HttpAnswer rates(const HttpRequest& request);

    HistoryReader* const m_history;
};

} // namespace zrm::host

#endif
