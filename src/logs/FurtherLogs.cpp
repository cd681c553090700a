#include "logs/FurtherLogs.h"

#include <mutex>
#include <utility>

namespace zrm::FurtherLogs {

namespace {

struct Published {
    std::mutex mutex; ///< guards the members below
    std::shared_ptr<const List> logs;
    std::set<std::string> leftOut;
    std::function<void()> onRefresh;
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

void noteLeftOut(std::set<std::string> names) {
    Published& present = state();
    const std::lock_guard guard(present.mutex);
    present.leftOut.swap(names);
}

bool isLeftOut(const std::string& name) {
    Published& present = state();
    const std::lock_guard guard(present.mutex);
    return present.leftOut.contains(name);
}

void setOnRefresh(std::function<void()> called) {
    Published& present = state();
    const std::lock_guard guard(present.mutex);
    present.onRefresh = std::move(called);
}

void noteRefresh() {
    std::function<void()> called;
    {
        Published& present = state();
        const std::lock_guard guard(present.mutex);
        called = present.onRefresh;
    }
    // Without the lock: whoever is called has locks of its own, with which it publishes.
    if (called) {
        called();
    }
}

} // namespace zrm::FurtherLogs
