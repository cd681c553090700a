#ifndef ZRM_HOST_DISTINCT_VALUES_H
#define ZRM_HOST_DISTINCT_VALUES_H

#include <cstddef>
#include <cstdint>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace zrm::host {

/// The different values within a period by the entries' times, of one group. Counts up to
/// `mostValues` exactly, and says that number where there are more. A value is remembered by 64
/// bits of a hash.
class DistinctValues {
public:
    static constexpr std::size_t mostValues = 10'000; ///< that are counted exactly
    static constexpr std::size_t mostSpans = 4;       ///< times that are further apart

    explicit DistinctValues(std::size_t most = mostValues) noexcept : m_most(most) {}

    /// Adds the value of an entry. Returns the number of different values in the period that ends
    /// with the newest entry less than a period away. Both in seconds.
    std::int64_t add(std::int64_t time, std::int64_t period, std::string_view value);

    /// The same for the period that ends with this time, or with a newer entry as there, whose
    /// value is not added.
    std::int64_t within(std::int64_t time, std::int64_t period) const;

private:
    /// Values whose times are less than a period before the newest one.
    struct Span {
        std::int64_t newest = 0;
        std::int64_t oldest = 0;                               ///< no value has an earlier time
        std::uint64_t used = 0;                                ///< number of the last addition
        std::unordered_map<std::uint64_t, std::int64_t> times; ///< of each value, the latest
    };
    std::size_t find(std::int64_t time, std::int64_t period) const;
    Span& spanOf(std::int64_t time, std::int64_t period);

    std::vector<Span> m_spans;
    std::uint64_t m_additions = 0;
    std::size_t m_most;
};

} // namespace zrm::host

#endif
