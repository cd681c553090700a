#ifndef ZRM_HOST_SITUATIONS_RESOURCE_H
#define ZRM_HOST_SITUATIONS_RESOURCE_H

#include "host/http/Message.h"
#include "host/http/Router.h"
#include "host/situations/SituationSet.h"

namespace zrm::host {

/// `/api/v1/situations` and the routes below it: shows and changes the situations.
class SituationsResource : public Resource {
public:
    /// `situations` must outlive the object.
    explicit SituationsResource(SituationSet& situations) : m_situations(situations) {}

    void addRoutes(Router& router) override;

private:
    HttpAnswer list() const;
    HttpAnswer show(const HttpRequest& request) const;
    HttpAnswer add(const HttpRequest& request);
    HttpAnswer replace(const HttpRequest& request);
    HttpAnswer remove(const HttpRequest& request);
    static HttpAnswer validate(const HttpRequest& request);

    SituationSet& m_situations;
};

} // namespace zrm::host

#endif
