#ifndef ZRM_HOST_REPORT_RESOURCE_H
#define ZRM_HOST_REPORT_RESOURCE_H

#include "host/api/SampleSource.h"
#include "host/framework/Condition.h"
#include "host/http/Message.h"
#include "host/http/Router.h"

#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// The request for a report.
struct ReportRequest {
    std::string log;  ///< full path
    std::string from; ///< 16-character time stamp, as `to`
    std::string to;
    std::vector<Condition> conditions; ///< all of the above, in the form that the agent takes

    /// Reads {"log", "from", "to", "where": [condition, ..]}; without `to`, up to the newest
    /// entry.
    /// Throws RequestRefused.
    static ReportRequest parse(std::string_view body);
};

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
