#ifndef ZRM_HOST_REPORT_RESOURCE_H
#define ZRM_HOST_REPORT_RESOURCE_H

#include "host/analysis/LogReport.h"
#include "host/http/Message.h"
#include "host/http/Router.h"

#include <chrono>
#include <cstdint>
#include <memory>
#include <string_view>

class TableManager;

namespace zrm::host {

/// The request for a report.
struct ReportRequest : ReportQuery {
    static constexpr std::int64_t mostRows = 10'000;

    /// Reads {"log", "from", "to", "where": [condition, ..], "fields": [name, ..], "limit"};
    /// without `to`, up to the newest entry. Throws RequestRefused.
    static ReportRequest parse(std::string_view body);
};

/// `POST /api/v1/reports`: the entries of a log between two times that meet conditions, sent as
/// they are found.
class ReportResource : public Resource {
public:
    /// The table's manager must outlive the object and every report.
    explicit ReportResource(TableManager& entries);
    /// Ends running reports.
    ~ReportResource() override;

    void addRoutes(Router& router) override;

    /// Makes running reports end soon, and begins no more. Any thread.
    void cancel();
    /// Waits for the end of running reports, at most until the limit. After cancel.
    void waitForEnd(std::chrono::steady_clock::time_point limit);

private:
    class Running;

    HttpAnswer report(const HttpRequest& request);

    TableManager& m_entries;
    const std::shared_ptr<Running> m_running; ///< shared with the reports' threads
};

} // namespace zrm::host

#endif
