#include "logtypes/QuarterHour.h"

#include "base/BrevanTime.h"
#include "base/DigitPairs.h"
#include "framework/trace.h"

#include <cstring>

namespace zrm {

namespace {

constexpr std::int64_t length = 900;
constexpr std::int64_t farAway = std::int64_t{1}
                                 << 36; // no arithmetic overflows on this side of it
constexpr std::size_t hourLength = 9;   // CYYMMDDhh
constexpr std::size_t stampLength = 16;

int twoDigits(const char* text) {
    return (text[0] - '0') * 10 + (text[1] - '0');
}

int secondOfHour(const char* stamp) {
    return twoDigits(stamp + hourLength) * 60 + twoDigits(stamp + hourLength + 2);
}

} // namespace

void QuarterHour::generateTimestamp(std::int64_t time, char* out) {
    const unsigned generation = TRC1_Generation.load(std::memory_order_relaxed);
    if (time < m_start || time >= m_end || generation != m_generation) {
        enter(time);
        m_generation = generation;
    }
    if (!m_isRegular) {
        BrevanTime::generateTimestamp(time, out);
        return;
    }
    const int second = m_secondOfHour + static_cast<int>(time - m_start);
    std::memcpy(out, m_hour, hourLength);
    DigitPairs::put(out + hourLength, static_cast<unsigned>(second) / 60);
    DigitPairs::put(out + hourLength + 2, static_cast<unsigned>(second) % 60);
    std::memset(out + hourLength + 4, '0', 3);
}

// A zone may change its offset within a quarter of an hour, and some offsets have split a quarter
// across two hours. Then its ends are in different hours, or not 899 seconds apart.
void QuarterHour::enter(std::int64_t time) {
    m_isRegular = false;
    if (time < -farAway || time > farAway || BrevanTime::isFlowTraced()) {
        m_end = m_start;
        return;
    }
    m_start = time - (time % length + length) % length;
    m_end = m_start + length;
    char first[stampLength];
    char last[stampLength];
    BrevanTime::generateTimestamp(m_start, first);
    BrevanTime::generateTimestamp(m_end - 1, last);
    m_secondOfHour = secondOfHour(first);
    m_isRegular = std::memcmp(first, last, hourLength) == 0 &&
                  secondOfHour(last) - m_secondOfHour == length - 1;
    std::memcpy(m_hour, first, hourLength);
}

} // namespace zrm
