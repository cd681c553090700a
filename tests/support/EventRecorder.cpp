#include "support/EventRecorder.h"

#include "monitor/LogFile.h"

#include <chrono>
#include <condition_variable>
#include <mutex>

using namespace zrm;

namespace {

struct Recorder {
    std::mutex mutex;
    std::condition_variable changed;
    std::vector<zrm_rmlogent_data_t> rows;
    std::function<void(std::size_t)> action;
    bool writesThresholds = false;
};

Recorder& recorder() {
    static auto* const theRecorder = new Recorder; // log threads may outlive main's objects
    return *theRecorder;
}

unsigned receive(zrm_rmlogent_data_t* rows, int count) {
    std::function<void(std::size_t)> action;
    std::size_t rowCount = 0;
    bool writesThresholds = false;
    {
        const std::lock_guard guard(recorder().mutex);
        recorder().rows.insert(recorder().rows.end(), rows, rows + count);
        rowCount = recorder().rows.size();
        action = recorder().action;
        writesThresholds = recorder().writesThresholds;
    }
    for (int i = 0; i < count && writesThresholds; ++i) {
        rows[i].freqthresh = 5;
        rows[i].periodthrs = 60;
    }
    recorder().changed.notify_all();
    if (action) {
        action(rowCount);
    }
    return 0;
}

[[maybe_unused]] const bool isInstalled = [] {
    LogFile::setRowReceiver(receive);
    return true;
}();

} // namespace

void EventRecorder::clear() {
    const std::lock_guard guard(recorder().mutex);
    recorder().rows.clear();
    recorder().action = nullptr;
    recorder().writesThresholds = false;
}

void EventRecorder::writeThresholds() {
    const std::lock_guard guard(recorder().mutex);
    recorder().writesThresholds = true;
}

void EventRecorder::onRow(std::function<void(std::size_t)> action) {
    const std::lock_guard guard(recorder().mutex);
    recorder().action = std::move(action);
}

std::vector<zrm_rmlogent_data_t> EventRecorder::rows() {
    const std::lock_guard guard(recorder().mutex);
    return recorder().rows;
}

std::vector<zrm_rmlogent_data_t> EventRecorder::waitForRows(std::size_t count, int seconds) {
    std::unique_lock lock(recorder().mutex);
    recorder().changed.wait_for(lock, std::chrono::seconds(seconds),
                                [&] { return recorder().rows.size() >= count; });
    return recorder().rows;
}
