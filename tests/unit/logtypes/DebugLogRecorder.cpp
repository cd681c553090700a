#include "DebugLogRecorder.h"

#include "monitor/LogFile.h"

#include <chrono>
#include <condition_variable>
#include <mutex>

using namespace zrm;

namespace {

struct Recorder {
    std::mutex mutex;
    std::condition_variable changed;
    std::vector<DebugLogRecorder::Record> records;
};

Recorder& recorder() {
    static auto* const theRecorder = new Recorder; // log threads may outlive main's objects
    return *theRecorder;
}

std::string bytes(const void* data, unsigned long length) {
    return data != nullptr ? std::string(static_cast<const char*>(data), length) : std::string();
}

} // namespace

void DebugLogRecorder::clear() {
    const std::lock_guard guard(recorder().mutex);
    recorder().records.clear();
}

std::vector<DebugLogRecorder::Record> DebugLogRecorder::records() {
    const std::lock_guard guard(recorder().mutex);
    return recorder().records;
}

std::vector<DebugLogRecorder::Record> DebugLogRecorder::waitForRecords(std::size_t count,
                                                                       int seconds) {
    std::unique_lock lock(recorder().mutex);
    recorder().changed.wait_for(lock, std::chrono::seconds(seconds),
                                [&] { return recorder().records.size() >= count; });
    return recorder().records;
}

// LogFile::writeToDebugLog under its linker name.
extern "C" void __real__ZN3zrm7LogFile15writeToDebugLogEPKvmS2_m(LogFile*, const void*,
                                                                 unsigned long, const void*,
                                                                 unsigned long);
extern "C" void __wrap__ZN3zrm7LogFile15writeToDebugLogEPKvmS2_m(LogFile* log, const void* data1,
                                                                 unsigned long length1,
                                                                 const void* data2,
                                                                 unsigned long length2);
extern "C" void __wrap__ZN3zrm7LogFile15writeToDebugLogEPKvmS2_m(LogFile* log, const void* data1,
                                                                 unsigned long length1,
                                                                 const void* data2,
                                                                 unsigned long length2) {
    {
        const std::lock_guard guard(recorder().mutex);
        recorder().records.push_back({bytes(data1, length1), bytes(data2, length2)});
    }
    recorder().changed.notify_all();
    __real__ZN3zrm7LogFile15writeToDebugLogEPKvmS2_m(log, data1, length1, data2, length2);
}
