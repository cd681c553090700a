#ifndef ZRM_INTERRUPTION_H
#define ZRM_INTERRUPTION_H

#include <functional>
#include <utility>

namespace zrm {

/// While it lives, searching and comparing large compressed files on this thread ends early once
/// the function returns true: to pass over gigabytes takes minutes. The function is called after
/// each megabyte or so. What was searched is unknown then; isDue says so. One within another ends
/// when either is due.
class Interruption {
public:
    explicit Interruption(std::function<bool()> isDue)
        : m_isDue(std::move(isDue)), m_outer(std::exchange(ofThisThread, this)) {}
    Interruption(const Interruption&) = delete;
    Interruption& operator=(const Interruption&) = delete;
    ~Interruption() { ofThisThread = m_outer; }

    /// False on a thread without an interruption.
    static bool isDue() {
        for (const Interruption* one = ofThisThread; one != nullptr; one = one->m_outer) {
            if (one->m_isDue()) {
                return true;
            }
        }
        return false;
    }

private:
    static inline thread_local Interruption* ofThisThread = nullptr;
    const std::function<bool()> m_isDue;
    Interruption* const m_outer; ///< null: none
};

} // namespace zrm

#endif
