#ifndef ZRM_TRACE_SCOPE_H
#define ZRM_TRACE_SCOPE_H

#include "framework/trace.h"

#include <cstdint>
#include <type_traits>

namespace zrm {

/// Traces one operation. The constructor reads the source file's trace level and writes the
/// entry event; the destructor writes the exit event on every return path. Lives on the stack
/// of one thread. It costs an operation on the per-line path only a few instructions. For that
/// the destructor must always be inlined: a call during unwinding would keep the members in
/// memory.
///
///     TraceScope trace(anchor);
///     trace.error()("Error opening file %s", name);   // written when the error class is on
///     return trace.result(count);                      // the exit event carries the count
class TraceScope {
public:
    /// A trace record to write, or nothing if its class is off.
    class Record {
    public:
        Record(const TRC1_Anchor* anchor, int line) noexcept : m_anchor(anchor), m_line(line) {}
        void operator()(const char* format, ...) const noexcept
            __attribute__((format(printf, 2, 3)));

    private:
        const TRC1_Anchor* m_anchor; ///< null: the class is off
        int m_line;
    };

    [[gnu::always_inline]] explicit TraceScope(TRC1_Anchor& anchor,
                                               int line = __builtin_LINE()) noexcept
        : m_anchor(anchor), m_level(level(anchor)), m_line(line) {
        if (isOn(TRC1_FLOW)) [[unlikely]] {
            TRC1_Event(m_anchor, m_line, TRC1_ENTRY);
        }
    }
    [[gnu::always_inline]] ~TraceScope() {
        if (isOn(TRC1_FLOW)) [[unlikely]] {
            TRC1_Event(m_anchor, m_line, m_hasResult ? TRC1_EXIT_VALUE : TRC1_EXIT, m_result);
        }
    }
    TraceScope(const TraceScope&) = delete;
    TraceScope& operator=(const TraceScope&) = delete;

    /// True if the class is on. For dumps, and to skip the work of building arguments.
    bool isOn(TRC1_Class traceClass) const noexcept { return (m_level & traceClass) != 0; }

    Record error(int line = __builtin_LINE()) const noexcept { return record(TRC1_ERROR, line); }
    Record detail(int line = __builtin_LINE()) const noexcept { return record(TRC1_DETAIL, line); }
    Record fine(int line = __builtin_LINE()) const noexcept { return record(TRC1_FINE, line); }
    /// A record that is written whatever the trace level.
    Record always(int line = __builtin_LINE()) const noexcept { return {&m_anchor, line}; }

    /// Stores the operation's result for the exit event (the address if it is a pointer) and
    /// returns it unchanged.
    template <typename Result> Result result(Result value) noexcept {
        m_hasResult = true;
        if constexpr (std::is_pointer_v<Result>) {
            m_result = reinterpret_cast<std::intptr_t>(value);
        } else {
            m_result = static_cast<long>(value); // NOLINT(bugprone-signed-char-misuse): signed
        }
        return value;
    }

private:
    static unsigned level(TRC1_Anchor& anchor) noexcept {
        // The acquire pairs with the release in TRC1_Sync: a matching generation implies its level.
        if (anchor.generation.load(std::memory_order_acquire) !=
            TRC1_Generation.load(std::memory_order_relaxed)) [[unlikely]] {
            return TRC1_Sync(anchor);
        }
        return anchor.level.load(std::memory_order_relaxed);
    }
    Record record(TRC1_Class traceClass, int line) const noexcept {
        return {isOn(traceClass) ? &m_anchor : nullptr, line};
    }

    TRC1_Anchor& m_anchor;
    unsigned m_level;
    int m_line;
    bool m_hasResult = false;
    long m_result = 0;
};

} // namespace zrm

#endif
