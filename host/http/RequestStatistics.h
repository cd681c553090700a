#ifndef ZRM_HOST_REQUEST_STATISTICS_H
#define ZRM_HOST_REQUEST_STATISTICS_H

#include <array>
#include <chrono>
#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <tuple>

namespace zrm::host {

/// Counts answered requests by route. Any thread.
class RequestStatistics {
public:
    /// Requests that are counted together. Their number is limited by the router's routes.
    struct Kind {
        std::string method; ///< empty when the request's head could not be read
        std::string route;  ///< pattern of the route; empty for unknown paths
        int status = 0;
        bool operator<(const Kind& other) const {
            return std::tie(method, route, status) <
                   std::tie(other.method, other.route, other.status);
        }
    };

    /// Upper bounds of the histogram buckets, in seconds. Longer durations are in no bucket.
    static constexpr std::array limits = {0.001, 0.005, 0.025, 0.1, 0.5, 2.5, 10.0};

    /// How long the answers of one route took, up to the point where their body was known.
    struct Durations {
        std::array<std::uint64_t, limits.size()> upTo{}; ///< answers within each limit
        std::uint64_t count = 0;
        double seconds = 0;
    };

    void count(const std::string& method, const std::string& route, int status,
               std::chrono::duration<double> time);

    std::map<Kind, std::uint64_t> counts() const;
    std::map<std::string, Durations> durations() const;

private:
    mutable std::mutex m_mutex;
    std::map<Kind, std::uint64_t> m_counts;
    std::map<std::string, Durations> m_durations; ///< by route
};

} // namespace zrm::host

#endif
