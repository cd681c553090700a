#ifndef ZRM_INTERRUPTION_H
#define ZRM_INTERRUPTION_H

#include <functional>
#include <utility>

namespace zrm {

/// While it lives, searching and comparing large compressed files on this thread ends early once
/// the function returns true: to pass over gigabytes takes minutes. The function is called after
/// each megabyte or so. What was searched is unknown then; isDue says so.
class Interruption {
public:
    explicit Interruption(std::function<bool()> isDue) : m_isDue(std::move(isDue)) {
        ofThisThread = this;
    }
    Interruption(const Interruption&) = delete;
    Interruption& operator=(const Interruption&) = delete;
    ~Interruption() { ofThisThread = nullptr; }

    /// False on a thread without an interruption.
    static bool isDue() { return ofThisThread != nullptr && ofThisThread->m_isDue(); }

private:
    static inline thread_local Interruption* ofThisThread = nullptr;
    const std::function<bool()> m_isDue;
};

} // namespace zrm

#endif
