#ifndef ZRM_TESTS_HANDOFF_H
#define ZRM_TESTS_HANDOFF_H

#include <mutex>

/// Synchronises a test with the server's threads. A request over a socket orders them as well, but
/// ThreadSanitizer does not know that. A thread that passes sees what others did before passing.
class Handoff {
public:
    void pass() { const std::lock_guard guard(m_mutex); }

private:
    std::mutex m_mutex;
};

#endif
