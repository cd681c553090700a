#ifndef ZRM_HOST_SILENCES_RESOURCE_H
#define ZRM_HOST_SILENCES_RESOURCE_H

#include "host/http/Message.h"
#include "host/http/Router.h"

namespace zrm::host {

class Silences;

/// `/api/v1/silences` and the routes below it: shows, creates and expires silences.
class SilencesResource : public Resource {
public:
    /// `silences` must outlive the object.
    explicit SilencesResource(Silences& silences) : m_silences(silences) {}

    void addRoutes(Router& router) override;

private:
    HttpAnswer list(const HttpRequest& request) const;
    HttpAnswer show(const HttpRequest& request) const;
    HttpAnswer add(const HttpRequest& request);
    HttpAnswer expire(const HttpRequest& request);

    Silences& m_silences;
};

} // namespace zrm::host

#endif
