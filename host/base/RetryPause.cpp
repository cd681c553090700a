#include "host/base/RetryPause.h"

#include <algorithm>
#include <cstdint>

namespace zrm::host {

namespace {

constexpr int cutDivisor = 4;

/// Differs from object to object and from process to process.
std::minstd_rand::result_type seedFor(const void* object) {
    const auto now = std::chrono::system_clock::now().time_since_epoch().count();
    return static_cast<std::minstd_rand::result_type>(reinterpret_cast<std::uintptr_t>(object)) ^
           static_cast<std::minstd_rand::result_type>(now);
}

} // namespace

RetryPause::RetryPause(Duration first, Duration longest)
    : m_first(first), m_longest(longest), m_whole(first), m_random(seedFor(this)) {}

RetryPause::Duration RetryPause::next() {
    const Duration whole = m_whole;
    m_whole = std::min(2 * m_whole, m_longest);
    std::uniform_int_distribution<Duration::rep> cut(0, whole.count() / cutDivisor);
    return whole - Duration(cut(m_random));
}

} // namespace zrm::host
