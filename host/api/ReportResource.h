#ifndef ZRM_HOST_REPORT_RESOURCE_H
#define ZRM_HOST_REPORT_RESOURCE_H

#include "host/api/SampleSource.h"
#include "host/http/HttpAnswer.h"
#include "host/http/HttpRequest.h"
#include "host/http/Resource.h"

namespace zrm::host {

/// `POST /api/v1/reports`: what a log holds between two times, where conditions hold.
class ReportResource : public Resource {
public:
    /// `source` outlives the object.
    explicit ReportResource(SampleSource& source) : m_source(source) {}

    void addRoutes(Router& router) override;

private:
    HttpAnswer report(const HttpRequest& request);

    SampleSource& m_source;
};

} // namespace zrm::host

#endif
