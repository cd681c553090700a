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

/// Counts the requests that were answered, by route. Any thread.
class RequestStatistics {
public:
    /// Requests that are counted together. There are only as many as the router has routes.
    struct Kind {
        std::string method; ///< empty when the request's head could not be read
        std::string route;  ///< its pattern; empty for paths at which nothing is
        int status = 0;
        bool operator<(const Kind& other) const {
            return std::tie(method, route, status) <
                   std::tie(other.method, other.route, other.status);
        }
    };

    /// Upper ends of the classes of durations: seconds. What takes longer is in none.
    static constexpr std::array limits = {0.001, 0.005, 0.025, 0.1, 0.5, 2.5, 10.0};

    /// The time that the answers of one route took, until their body was known.
    struct Durations {
        std::array<std::uint64_t, limits.size()> upTo{}; ///< answers that took up to the limit
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
