#ifndef ZRM_HOST_SAMPLE_RESOURCE_H
#define ZRM_HOST_SAMPLE_RESOURCE_H

#include "host/api/SampleSource.h"
#include "host/framework/Condition.h"
#include "host/http/Message.h"
#include "host/http/Router.h"

#include <string_view>
#include <vector>

namespace zrm::host {

/// Reads the body of a sample request. Stateless.
class SampleRequest {
public:
    /// The conditions of {"filters": [{"column": .., "op": .., "value": ..}, ..]} on a table's
    /// columns. A report on Log Entries must name its log and both ends of its time window. Throws
    /// RequestRefused.
    static std::vector<Condition> parse(std::string_view table, std::string_view body);
};

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
