#ifndef ZRM_HOST_STOP_SIGNAL_H
#define ZRM_HOST_STOP_SIGNAL_H

#include <atomic>

/// Tells threads that wait for descriptors that the server stops: one more descriptor, which can
/// be read from then on. Any thread.
class StopSignal {
public:
    StopSignal();
    ~StopSignal();
    StopSignal(const StopSignal&) = delete;
    StopSignal& operator=(const StopSignal&) = delete;

    /// False when the system has no descriptor for it.
    bool isUsable() const noexcept { return m_readEnd != -1; }

    void raise() noexcept;
    bool isRaised() const noexcept { return m_writeEnd.load() == -1; }

    /// For poll alone; nothing is ever read from it.
    int descriptor() const noexcept { return m_readEnd; }

private:
    int m_readEnd = -1;
    std::atomic<int> m_writeEnd{-1}; ///< closed when the signal is raised
};

#endif
