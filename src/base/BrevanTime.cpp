#include "base/BrevanTime.h"

#include "base/TraceScope.h"

#include <cstdio>
#include <cstring>
#include <ctime>
#include <limits>

namespace zrm {

namespace {

TRC1_Anchor anchor{"BrevanTime.cpp"};

constexpr std::size_t stampLength = 16;

/// The stamp of the second that the thread last asked for. Valid until a trace level changes. Never
/// valid while the flow class is traced, because then each call must be traced.
struct CurrentStamp {
    std::time_t second = std::numeric_limits<std::time_t>::min();
    unsigned generation = 0; ///< of the trace levels; 0: the stamp is not valid
    char text[stampLength] = {};
};

constinit thread_local CurrentStamp currentStamp;

/// Makes the current stamp that of the second. Apart from its caller, whose path per line then
/// needs no room for the text of a time.
[[gnu::noinline]] void makeCurrentStamp(std::time_t second, unsigned generation) {
    BrevanTime::generateTimestamp(second, currentStamp.text);
    currentStamp.second = second;
    currentStamp.generation = BrevanTime::isFlowTraced() ? 0 : generation;
}

} // namespace

void BrevanTime::generateTimestamp(long time, char* out) {
    TraceScope trace(anchor);
    const std::time_t seconds = time;
    std::tm parts{};
    localtime_r(&seconds, &parts);
    // Room for any int in each field. Years after 2899 need a fourth digit and are cut below.
    char text[96];
    std::snprintf(text, sizeof text, "%03d%02d%02d%02d%02d%02d000", parts.tm_year, parts.tm_mon + 1,
                  parts.tm_mday, parts.tm_hour, parts.tm_min, parts.tm_sec);
    std::memcpy(out, text, stampLength);
}

bool BrevanTime::isFlowTraced() noexcept {
    return (TRC1_Sync(anchor) & TRC1_FLOW) != 0;
}

void BrevanTime::generateCurrentTimestamp(char* out) {
    const std::time_t now = std::time(nullptr);
    const unsigned generation = TRC1_Generation.load(std::memory_order_relaxed);
    if (now != currentStamp.second || generation != currentStamp.generation) {
        makeCurrentStamp(now, generation);
    }
    std::memcpy(out, currentStamp.text, stampLength);
}

} // namespace zrm
