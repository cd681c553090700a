#ifndef ZRM_HOST_REPORT_RESOURCE_H
#define ZRM_HOST_REPORT_RESOURCE_H

#include "host/api/SampleSource.h"
#include "host/http/HttpAnswer.h"
#include "host/http/HttpRequest.h"
#include "host/http/Resource.h"

namespace zrm::host {

/// `POST /api/v1/reports`: the entries of a log between two times that meet conditions.
class ReportResource : public Resource {
public:
    /// `source` must outlive the object.
    explicit ReportResource(SampleSource& source) : m_source(source) {}

    void addRoutes(Router& router) override;

private:
    HttpAnswer report(const HttpRequest& request);

    SampleSource& m_source;
};

} // namespace zrm::host

#endif
