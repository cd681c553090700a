#ifndef ZRM_HOST_SAMPLE_RESOURCE_H
#define ZRM_HOST_SAMPLE_RESOURCE_H

#include "host/api/SampleSource.h"
#include "host/http/HttpAnswer.h"
#include "host/http/HttpRequest.h"
#include "host/http/Resource.h"

#include <vector>

namespace zrm::host {

/// `POST /api/v1/tables/{table}/sample`: the rows of one sample of a table.
class SampleResource : public Resource {
public:
    /// `source` must outlive the object.
    explicit SampleResource(SampleSource& source) : m_source(source) {}

    void addRoutes(Router& router) override;

private:
    HttpAnswer sample(const HttpRequest& request);

    SampleSource& m_source;
};

} // namespace zrm::host

#endif
