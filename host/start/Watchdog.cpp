#include "host/start/Watchdog.h"

#include "host/base/Say.h"
#include "host/framework/PulseRegistry.h"

#include <cstdlib>
#include <system_error>
#include <utility>
#include <vector>

#include <signal.h>
#include <unistd.h>

namespace zrm::host {

namespace {

constexpr std::chrono::milliseconds lookInterval{200};

/// The manager's thread takes a signal at once unless it is stuck.
constexpr int looksUntilStuck = 2;
constexpr int forcedStatus = 255;

bool isPending(const sigset_t& signals, std::initializer_list<int> numbers) {
    for (const int number : numbers) {
        if (sigismember(&signals, number) == 1) {
            return true;
        }
    }
    return false;
}

} // namespace

bool Watchdog::start(std::function<void()> requestStop) {
    m_requestStop = std::move(requestStop);
    try {
        std::thread(&Watchdog::watch, this).detach();
    } catch (const std::system_error&) {
        return false;
    }
    return true;
}

void Watchdog::noteStopping() noexcept {
    Clock::rep none = 0;
    m_stoppingSince.compare_exchange_strong(none, Clock::now().time_since_epoch().count());
}

std::string Watchdog::problem() const {
    const std::lock_guard guard(m_mutex);
    return m_problem;
}

void Watchdog::watch() {
    for (;;) {
        lookAtSignals();
        lookAtEnd();
        lookAtPulses();
        std::this_thread::sleep_for(lookInterval);
    }
}

void Watchdog::lookAtSignals() {
    sigset_t signals;
    sigemptyset(&signals);
    sigpending(&signals);
    m_looksWithQuit = isPending(signals, {SIGQUIT}) ? m_looksWithQuit + 1 : 0;
    m_looksWithStop = isPending(signals, {SIGTERM, SIGINT}) ? m_looksWithStop + 1 : 0;
    if (m_looksWithQuit >= looksUntilStuck) {
        std::abort();
    }
    if (m_looksWithStop >= looksUntilStuck && !m_hasAsked) {
        m_hasAsked = true;
        noteStopping();
        m_requestStop();
    }
}

void Watchdog::lookAtEnd() const {
    const Clock::time_point begin{Clock::duration(m_stoppingSince.load())};
    if (begin == Clock::time_point{} || Clock::now() - begin < endLimit) {
        return;
    }
    std::string who;
    for (const PulseRegistry::Working& working : PulseRegistry::look()) {
        who += "; " + working.subject + " " + working.doing;
    }
    say("forced to stop after %d seconds: the main thread was %s%s. Nothing more is delivered",
        static_cast<int>(std::chrono::duration_cast<std::chrono::seconds>(endLimit).count()),
        m_stage.load(), who.c_str());
    _exit(forcedStatus);
}

void Watchdog::lookAtPulses() {
    std::string problem;
    std::string named;
    for (const PulseRegistry::Working& working : PulseRegistry::look()) {
        if (working.standing >= stillLimit) {
            const bool isLog = working.subject.starts_with('/');
            const std::string still = std::string(" has made no progress for ") +
                                      std::to_string(working.standing.count()) + " seconds: it " +
                                      working.doing;
            if (problem.empty()) {
                problem = (isLog ? "the thread of a log" : working.subject) + still;
                named = (isLog ? "the thread of " : "") + working.subject + still;
            }
        }
    }
    std::unique_lock lock(m_mutex);
    const bool hadProblem = !m_problem.empty();
    m_problem = problem;
    lock.unlock();
    if (hadProblem != !problem.empty()) {
        say("%s", problem.empty()
                      ? "the log manager and the threads of all logs are making progress again"
                      : named.c_str());
    }
}

} // namespace zrm::host
