#ifndef ZRM_HOST_EPISODES_RESOURCE_H
#define ZRM_HOST_EPISODES_RESOURCE_H

#include "host/http/Message.h"
#include "host/http/Router.h"

#include <cstdint>

namespace zrm::host {

class Acknowledgements;
class HistoryReader;
struct EpisodeRecord;

/// `/api/v1/episodes` and the routes below it: shows the episodes of the history, and acknowledges
/// them.
class EpisodesResource : public Resource {
public:
    /// Both must outlive the object; null when the history is off.
    EpisodesResource(HistoryReader* history, Acknowledgements* acknowledgements)
        : m_history(history), m_acknowledgements(acknowledgements) {}

    void addRoutes(Router& router) override;

private:
    HttpAnswer episodes(const HttpRequest& request);
    HttpAnswer episode(const HttpRequest& request);
    HttpAnswer acknowledge(const HttpRequest& request);
    HttpAnswer withdraw(const HttpRequest& request);
    EpisodeRecord find(std::uint64_t id);

    HistoryReader* const m_history;
    Acknowledgements* const m_acknowledgements;
};

} // namespace zrm::host

#endif
