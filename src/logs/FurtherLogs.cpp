#include "logs/FurtherLogs.h"

#include <mutex>
#include <utility>

namespace zrm::FurtherLogs {

namespace {

struct Published {
    std::mutex mutex; ///< guards the list
    std::shared_ptr<const List> logs;
};

/// Never destroyed: threads that outlive main may use it.
Published& state() {
    static auto* const theState = new Published;
    return *theState;
}

} // namespace

void publish(std::shared_ptr<const List> logs) {
    Published& present = state();
    const std::lock_guard guard(present.mutex);
    present.logs.swap(logs); // the old list is freed after the lock is released
}

std::shared_ptr<const List> published() {
    Published& present = state();
    const std::lock_guard guard(present.mutex);
    return present.logs;
}

} // namespace zrm::FurtherLogs
