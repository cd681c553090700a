#include "host/framework/PulseRegistry.h"

#include <mutex>
#include <thread>

using namespace zrm::host;

namespace {

// Constant-initialised and without destructors: logs may be destroyed while the process exits.
constinit std::mutex listMutex;
constinit Pulse* first = nullptr;

constexpr std::chrono::milliseconds lookInterval{5};

} // namespace

/// The list of all pulses.
class Pulse::Framework {
public:
    static void add(Pulse& pulse);
    static void remove(Pulse& pulse);
    static std::vector<PulseRegistry::Working> look(PulseRegistry::Clock::time_point now);
};

Pulse::Pulse(const char* subject, const std::atomic<std::int64_t>* progress)
    : m_subject(subject), m_progress(progress) {
    Framework::add(*this);
}

Pulse::~Pulse() {
    Framework::remove(*this);
}

void Pulse::Framework::add(Pulse& pulse) {
    const std::lock_guard guard(listMutex);
    pulse.m_next = first;
    if (first != nullptr) {
        first->m_previous = &pulse;
    }
    first = &pulse;
}

void Pulse::Framework::remove(Pulse& pulse) {
    const std::lock_guard guard(listMutex);
    (pulse.m_previous != nullptr ? pulse.m_previous->m_next : first) = pulse.m_next;
    if (pulse.m_next != nullptr) {
        pulse.m_next->m_previous = pulse.m_previous;
    }
}

std::vector<PulseRegistry::Working> Pulse::Framework::look(PulseRegistry::Clock::time_point now) {
    std::vector<PulseRegistry::Working> working;
    const std::lock_guard guard(listMutex);
    for (Pulse* pulse = first; pulse != nullptr; pulse = pulse->m_next) {
        const std::int64_t progress = pulse->progress();
        if (progress != pulse->m_seen) {
            pulse->m_seen = progress;
            pulse->m_moved = now;
        }
        if (const char* const doing = pulse->m_doing.load(std::memory_order_relaxed)) {
            working.push_back(
                {pulse->m_subject, doing,
                 std::chrono::duration_cast<std::chrono::seconds>(now - pulse->m_moved)});
        }
    }
    return working;
}

std::vector<PulseRegistry::Working> PulseRegistry::look(Clock::time_point now) {
    return Pulse::Framework::look(now);
}

bool PulseRegistry::waitUntilAllRest(Clock::time_point limit) {
    while (!look().empty()) {
        if (Clock::now() >= limit) {
            return false;
        }
        std::this_thread::sleep_for(lookInterval);
    }
    return true;
}
