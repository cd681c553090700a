#include "host/history/RetentionClock.h"

namespace zrm::host {

namespace {

using namespace std::chrono_literals;

/// More than a clock differs between two calls after a small adjustment or a sleep of the machine.
constexpr std::chrono::milliseconds leap = 1h;
constexpr std::chrono::milliseconds patience = 1h;

} // namespace

std::int64_t RetentionClock::now(std::int64_t wall, Clock::time_point steady) {
    if (m_wall) {
        const auto passed =
            std::chrono::duration_cast<std::chrono::milliseconds>(steady - m_steady);
        const std::int64_t expected = *m_wall + passed.count();
        if (wall > expected + leap.count()) {
            m_leaptAt = m_leaptAt.value_or(steady);
            if (steady - *m_leaptAt < patience) {
                return expected;
            }
        }
    }
    m_leaptAt.reset();
    m_wall = wall;
    m_steady = steady;
    return wall;
}

} // namespace zrm::host
