#ifndef ZRM_TIMESTAMP_H
#define ZRM_TIMESTAMP_H

#include <cstdint>

namespace zrm {

/// One element of a situation's circular chain of event times, newest at the head. The owner keeps
/// the head's address (null for an empty chain); deleting the head deletes the chain. Not locked:
/// the table manager's lock guards a situation's chain.
class Timestamp {
public:
    /// Joins the chain as its new head, which `*pHeadOfChain` then points to.
    Timestamp(Timestamp** pHeadOfChain, long newTime);
    /// The same from a 16-character time stamp. A text that does not convert leaves the element
    /// outside the chain with an event time of -1 or below; the caller deletes it.
    Timestamp(Timestamp** pHeadOfChain, const char* pNewTime);
    Timestamp(const Timestamp&) = delete;
    Timestamp& operator=(const Timestamp&) = delete;
    /// Deletes the older elements behind this one, up to the head.
    virtual ~Timestamp();

    /// Links this element in before `head` (null: alone) and makes it the head.
    void addToChain(Timestamp* head);
    /// On the head: number of events later than `period` seconds ago; the others are deleted, but
    /// never the head. -1 on any other element.
    long countEvents(long period);
    /// The same as of `now`, seconds since the epoch.
    long countEvents(long period, std::int64_t now);

    std::int64_t eventTime() const noexcept { return m_eventTime; }
    bool isHeadOfChain() const noexcept { return m_isHeadOfChain; }
    Timestamp* next() const noexcept { return m_next; }
    Timestamp* prev() const noexcept { return m_prev; }

private:
    Timestamp* newestOut(long cutOff) const;
    void prune(Timestamp& newestOut);

    bool m_isHeadOfChain = false;
    std::int64_t m_eventTime = -1;
    Timestamp* m_next = nullptr; ///< the next older element; from the oldest back to the head
    Timestamp* m_prev = nullptr;

    // Events need not come in the order of their times. The lows of a chain are its head and each
    // element with an earlier time than all newer ones: the newest event that has left a period is
    // one of them, and the others that have left it are the lows behind it. So a busy situation's
    // events are counted without a walk over them.
    std::int64_t m_number = 0;       ///< counts up from the oldest to the head
    Timestamp* m_olderLow = nullptr; ///< of a low
    Timestamp* m_newerLow = nullptr; ///< of a low
    Timestamp* m_oldestLow = this;   ///< of the head
};

} // namespace zrm

#endif
