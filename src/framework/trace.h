#ifndef ZRM_FRAMEWORK_TRACE_H
#define ZRM_FRAMEWORK_TRACE_H

#include <atomic>
#include <cstdarg>

/// Classes of trace records: the bits of a trace level.
enum TRC1_Class : unsigned {
    TRC1_FINE = 0x01,   ///< per-row and per-event detail
    TRC1_DETAIL = 0x10, ///< state dumps, decisions, successes
    TRC1_FLOW = 0x40,   ///< entry and exit of operations
    TRC1_ERROR = 0x80,  ///< every error and rejected input
};

/// Kinds of trace events.
enum TRC1_EventKind : int {
    TRC1_ENTRY = 0,
    TRC1_EXIT_VALUE = 1, ///< exit; the event carries the operation's result
    TRC1_EXIT = 2,
};

/// The trace anchor of one source file: its name and its last known trace level.
/// Constant-initialised and trivially destructible, so it can be used before main and by threads
/// that outlive the exit routine.
struct TRC1_Anchor {
    const char* unit;                    ///< file name, for example "ValidLog.cpp"
    std::atomic<unsigned> generation{0}; ///< generation in which `level` was read; 0: never
    std::atomic<unsigned> level{0};      ///< set of TRC1_Class bits
};

/// The framework's current generation of the trace configuration; never 0. An anchor with a
/// different generation must be synchronised before its level is used.
extern std::atomic<unsigned> TRC1_Generation;

/// Re-reads the anchor's level, stores it with its generation, and returns it. Any thread.
unsigned TRC1_Sync(TRC1_Anchor& anchor) noexcept;

/// Writes one record whatever the level. `line` is the source line of the call. Any thread,
/// including a forked child before its exec: takes no locks and no memory. Preserves errno.
void TRC1_Printf(const TRC1_Anchor& anchor, int line, const char* format, ...) noexcept
    __attribute__((format(printf, 3, 4)));

/// TRC1_Printf with a va_list.
void TRC1_VPrintf(const TRC1_Anchor& anchor, int line, const char* format,
                  std::va_list arguments) noexcept __attribute__((format(printf, 3, 0)));

/// Writes the entry or exit event of an operation. Only TRC1_EXIT_VALUE uses `value`.
void TRC1_Event(const TRC1_Anchor& anchor, int line, TRC1_EventKind kind, long value = 0) noexcept;

#endif
