#include "support/RecordingTrace.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <condition_variable>
#include <cstdarg>
#include <cstdio>
#include <mutex>

#include <sys/mman.h>
#include <unistd.h>

std::atomic<unsigned> TRC1_Generation{1};

namespace {

struct Recorder {
    // Constructed on first use and never destroyed: threads may trace until the process is gone.
    std::mutex mutex;
    std::condition_variable changed;
    std::vector<std::string> messages;
    std::vector<std::string> events;
    std::atomic<unsigned> level{0};
};

/// Records of forked children. They share this memory with the test and must neither lock nor
/// allocate.
struct ChildRecords {
    struct Record {
        std::atomic<bool> isComplete;
        char text[2048];
    };
    std::atomic<std::size_t> used;
    std::array<Record, 128> records;

    void clear() {
        for (Record& record : records) {
            record.isComplete = false;
        }
        used = 0;
    }
    void add(const char* text) {
        const std::size_t place = used++;
        if (place < records.size()) {
            char* const copy = records[place].text;
            copy[std::string_view(text).copy(copy, sizeof records[place].text - 1)] = '\0';
            records[place].isComplete = true;
        }
    }
};

ChildRecords& childRecords() {
    static auto* const theRecords = static_cast<ChildRecords*>(mmap(
        nullptr, sizeof(ChildRecords), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0));
    return *theRecords;
}

/// The process that reads the records.
std::atomic<pid_t> testProcess{0};

bool isForkedChild() {
    return testProcess != 0 && getpid() != testProcess && !testing::internal::InDeathTestChild();
}

Recorder& recorder() {
    static Recorder* const theRecorder = new Recorder;
    return *theRecorder;
}

void echoInDeathTest(const std::string& text) {
    if (testing::internal::InDeathTestChild()) {
        const std::string line = text + "\n";
        [[maybe_unused]] const auto written = write(STDERR_FILENO, line.data(), line.size());
    }
}

} // namespace

unsigned TRC1_Sync(TRC1_Anchor& anchor) noexcept {
    const unsigned level = recorder().level.load();
    anchor.level.store(level);
    anchor.generation.store(TRC1_Generation.load(), std::memory_order_release);
    return level;
}

void TRC1_VPrintf(const TRC1_Anchor& /*anchor*/, int /*line*/, const char* format,
                  std::va_list arguments) noexcept {
    const int savedErrno = errno;
    char text[16384];
    std::vsnprintf(text, sizeof text, format, arguments);
    if (isForkedChild()) {
        childRecords().add(text);
        errno = savedErrno;
        return;
    }
    echoInDeathTest(text);
    {
        const std::lock_guard guard(recorder().mutex);
        recorder().messages.emplace_back(text);
    }
    recorder().changed.notify_all();
    errno = savedErrno;
}

void TRC1_Printf(const TRC1_Anchor& anchor, int line, const char* format, ...) noexcept {
    std::va_list arguments;
    va_start(arguments, format);
    TRC1_VPrintf(anchor, line, format, arguments);
    va_end(arguments);
}

void TRC1_Event(const TRC1_Anchor& anchor, int /*line*/, TRC1_EventKind kind, long value) noexcept {
    if (isForkedChild()) {
        return;
    }
    std::string text = std::string(anchor.unit) + (kind == TRC1_ENTRY ? " entry" : " exit");
    if (kind == TRC1_EXIT_VALUE) {
        text += " " + std::to_string(value);
    }
    const std::lock_guard guard(recorder().mutex);
    recorder().events.push_back(text);
}

RecordingTrace::RecordingTrace(unsigned level) {
    testProcess = getpid();
    clear();
    setLevel(level);
}

RecordingTrace::~RecordingTrace() {
    setLevel(0);
}

void RecordingTrace::setLevel(unsigned level) {
    recorder().level = level;
    ++TRC1_Generation;
}

std::vector<std::string> RecordingTrace::messages() const {
    const std::lock_guard guard(recorder().mutex);
    return recorder().messages;
}

std::vector<std::string> RecordingTrace::childMessages() const {
    const ChildRecords& children = childRecords();
    std::vector<std::string> messages;
    for (std::size_t i = 0; i < std::min(children.used.load(), children.records.size()); ++i) {
        if (children.records[i].isComplete) {
            messages.emplace_back(children.records[i].text);
        }
    }
    return messages;
}

std::vector<std::string> RecordingTrace::events() const {
    const std::lock_guard guard(recorder().mutex);
    return recorder().events;
}

int RecordingTrace::count(const std::string& text) const {
    const std::lock_guard guard(recorder().mutex);
    return static_cast<int>(
        std::count(recorder().messages.begin(), recorder().messages.end(), text));
}

bool RecordingTrace::waitFor(const std::string& text, int seconds) const {
    std::unique_lock lock(recorder().mutex);
    return recorder().changed.wait_for(lock, std::chrono::seconds(seconds), [&] {
        const auto& messages = recorder().messages;
        return std::find(messages.begin(), messages.end(), text) != messages.end();
    });
}

void RecordingTrace::clear() {
    const std::lock_guard guard(recorder().mutex);
    recorder().messages.clear();
    recorder().events.clear();
    childRecords().clear();
}
