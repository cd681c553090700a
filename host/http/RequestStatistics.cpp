#include "host/http/RequestStatistics.h"

#include <cstddef>

namespace zrm::host {

void RequestStatistics::count(const std::string& method, const std::string& route, int status,
                              std::chrono::duration<double> time) {
    const std::lock_guard guard(m_mutex);
    ++m_counts[{method, route, status}];
    Durations& durations = m_durations[route];
    ++durations.count;
    durations.seconds += time.count();
    for (std::size_t at = 0; at < limits.size(); ++at) {
        durations.upTo[at] += time.count() <= limits[at] ? 1 : 0;
    }
}

std::map<RequestStatistics::Kind, std::uint64_t> RequestStatistics::counts() const {
    const std::lock_guard guard(m_mutex);
    return m_counts;
}

std::map<std::string, RequestStatistics::Durations> RequestStatistics::durations() const {
    const std::lock_guard guard(m_mutex);
    return m_durations;
}

} // namespace zrm::host
