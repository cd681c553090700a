#include "host/framework/Sample.h"

#include "host/framework/Request.h"
#include "host/framework/RequestState.h"
#include "host/framework/Tables.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

namespace {

/// Collects the rows that a report dispatches.
class Collector : public RowReceiver {
public:
    unsigned receive(const ctreq& request, const char* rows, unsigned count) override {
        m_rows.insert(m_rows.end(), rows, rows + std::size_t{count} * request.rowSize);
        return 0;
    }
    void stopped(const ctreq& /*request*/, unsigned /*reason*/) override {}

    std::vector<char> takeRows() { return std::move(m_rows); }

private:
    std::vector<char> m_rows;
};

} // namespace

Sample::Sample(RowLayout layout, std::size_t rowSize, std::vector<char> rows, std::uint64_t offered)
    : m_layout(std::move(layout)), m_rowSize(rowSize), m_rows(std::move(rows)), m_offered(offered) {
}

std::optional<Sample> Sample::take(std::string_view table, std::vector<Condition> conditions,
                                   std::string label) {
    TableManager* const manager = Tables::find(table);
    if (manager == nullptr) {
        return std::nullopt;
    }
    Collector collector;
    RequestDetail detail;
    detail.name = std::move(label);
    detail.sampleType = SAMPLE_REPORT;
    detail.conditions = std::move(conditions);
    // The table takes the log's name from the first condition on it, whatever its operator.
    std::stable_partition(detail.conditions.begin(), detail.conditions.end(),
                          [](const Condition& condition) { return condition.op == INTF_EQUAL; });
    const Request request(*manager, std::move(detail), collector);
    if (!request.isOpen()) {
        return std::nullopt;
    }
    ctreq& sampled = *request.get();
    sampled.TakeSample();
    // The table leaves its rows in the request.
    sampled.Dispatch();
    return Sample(RowLayout(sampled), sampled.rowSize, collector.takeRows(),
                  sampled.framework().counts.judged());
}

} // namespace zrm::host
