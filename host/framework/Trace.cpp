// The host's implementation of trace.h.
#include "framework/trace.h"

#include "host/framework/CancellationOff.h"
#include "host/framework/TraceCapture.h"
#include "host/framework/TraceControl.h"
#include "host/framework/TraceOutput.h"
#include "host/framework/TraceRecord.h"

#include <cerrno>
#include <ctime>

#include <unistd.h>

using namespace zrm::host;

std::atomic<unsigned> TRC1_Generation{1};

unsigned TRC1_Sync(TRC1_Anchor& anchor) noexcept {
    // Another thread may store an older level after this one stored its own. Each of them
    // checks afterwards whether the generation has moved on, so the last to store has the latest.
    for (;;) {
        const unsigned generation = TRC1_Generation.load();
        if (TraceCapture::exists()) {
            // Levels differ from thread to thread: no source file learns one.
            return TraceCapture::current() != nullptr ? static_cast<unsigned>(TRC1_ERROR)
                                                      : TraceControl::levelOf(anchor.unit);
        }
        const unsigned level = TraceControl::levelOf(anchor.unit);
        anchor.level.store(level);
        anchor.generation.store(generation);
        if (TRC1_Generation.load() == generation) {
            return level;
        }
    }
}

void TRC1_VPrintf(const TRC1_Anchor& anchor, int line, const char* format,
                  std::va_list arguments) noexcept {
    const int savedErrno = errno;
    if (TraceCapture* const capture = TraceCapture::current()) {
        capture->add(format, arguments);
    } else if (!TraceSilence::isOn()) {
        // The write is a cancellation point, and an unwind must not meet this noexcept.
        const CancellationOff guard;
        std::timespec now{};
        clock_gettime(CLOCK_REALTIME, &now);
        TraceRecord record(now, gettid(), anchor.unit, line);
        record.addList(format, arguments);
        TraceOutput::write(record.finish(), now.tv_sec);
    }
    errno = savedErrno;
}

void TRC1_Printf(const TRC1_Anchor& anchor, int line, const char* format, ...) noexcept {
    std::va_list arguments;
    va_start(arguments, format);
    TRC1_VPrintf(anchor, line, format, arguments);
    va_end(arguments);
}

void TRC1_Event(const TRC1_Anchor& anchor, int line, TRC1_EventKind kind, long value) noexcept {
    switch (kind) {
    case TRC1_ENTRY:
        TRC1_Printf(anchor, line, "Entry");
        break;
    case TRC1_EXIT_VALUE:
        TRC1_Printf(anchor, line, "Exit: %ld", value);
        break;
    case TRC1_EXIT:
        TRC1_Printf(anchor, line, "Exit");
        break;
    }
}
