#ifndef ZRM_HOST_EPISODES_RESOURCE_H
#define ZRM_HOST_EPISODES_RESOURCE_H

#include "host/http/Message.h"
#include "host/http/Router.h"

namespace zrm::host {

class HistoryReader;

/// The episodes of the history: `GET /api/v1/episodes` and `GET /api/v1/episodes/{id}`.
class EpisodesResource : public Resource {
public:
    /// `history` must outlive the object; null when the history is off.
    explicit EpisodesResource(HistoryReader* history) : m_history(history) {}

    void addRoutes(Router& router) override;

private:
    HttpAnswer episodes(const HttpRequest& request);
    HttpAnswer episode(const HttpRequest& request);

    HistoryReader* const m_history;
};

} // namespace zrm::host

#endif
