#ifndef ZRM_TESTS_HANDOFF_H
#define ZRM_TESTS_HANDOFF_H

#include <mutex>

/// Orders what a test and the server's threads do: a request over a socket orders it too, but
/// ThreadSanitizer does not know. Whoever passes sees what others did before they passed.
class Handoff {
public:
    void pass() { const std::lock_guard guard(m_mutex); }

private:
    std::mutex m_mutex;
};

#endif
