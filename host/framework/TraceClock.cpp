#include "host/framework/TraceClock.h"

#include "host/base/ForkedChild.h"

#include <atomic>
#include <chrono>
#include <cstdint>

#include <time.h>

namespace zrm::host {

namespace {

constexpr std::int64_t quarterHour = 15 * 60;

/// The cached value: the quarter (counted from the epoch) in the upper half, the offset from UTC in
/// seconds in the lower. 0 is midnight of the epoch, at UTC.
std::atomic<std::uint64_t> g_learnt{0};

std::uint64_t pack(std::int64_t quarter, std::int64_t offset) noexcept {
    return static_cast<std::uint64_t>(quarter) << 32 |
           static_cast<std::uint32_t>(static_cast<std::int32_t>(offset));
}

std::int64_t quarterOf(std::uint64_t learnt) noexcept {
    return static_cast<std::int32_t>(learnt >> 32);
}

std::int64_t offsetOf(std::uint64_t learnt) noexcept {
    return static_cast<std::int32_t>(learnt & 0xffffffff);
}

std::int64_t offsetAt(std::time_t seconds) noexcept {
    const std::uint64_t learnt = g_learnt.load(std::memory_order_relaxed);
    const std::int64_t quarter = seconds / quarterHour;
    if (quarterOf(learnt) == quarter || ForkedChild::isCaller()) {
        return offsetOf(learnt);
    }
    std::tm parts{};
    if (localtime_r(&seconds, &parts) == nullptr) {
        return offsetOf(learnt);
    }
    g_learnt.store(pack(quarter, parts.tm_gmtoff), std::memory_order_relaxed);
    return parts.tm_gmtoff;
}

} // namespace

TraceClock::Time TraceClock::local(const std::timespec& moment) noexcept {
    using namespace std::chrono;
    const sys_seconds shifted{seconds{moment.tv_sec + offsetAt(moment.tv_sec)}};
    const sys_days midnight = floor<days>(shifted);
    const year_month_day date{midnight};
    const hh_mm_ss time{shifted - midnight};
    return {static_cast<int>(date.year()),
            static_cast<unsigned>(date.month()),
            static_cast<unsigned>(date.day()),
            static_cast<int>(time.hours().count()),
            static_cast<int>(time.minutes().count()),
            static_cast<int>(time.seconds().count()),
            moment.tv_nsec / 1000};
}

} // namespace zrm::host
