#ifndef ZRM_TIMESTAMP_H
#define ZRM_TIMESTAMP_H

#include <cstdint>

namespace zrm {

/// One element of a situation's circular chain of event times, newest at the head. The owner stores
/// the head's address (null: empty chain); deleting the head deletes the chain. Not locked: the
/// table manager's lock guards a situation's chain.
class Timestamp {
public:
    /// Joins the chain as its new head and updates `*pHeadOfChain`.
    Timestamp(Timestamp** pHeadOfChain, long newTime);
    /// Does the same from a 16-character time stamp. If the text does not convert, the element
    /// stays outside the chain with an event time of -1 or less, and the caller deletes it.
    Timestamp(Timestamp** pHeadOfChain, const char* pNewTime);
    Timestamp(const Timestamp&) = delete;
    Timestamp& operator=(const Timestamp&) = delete;
    /// Deletes the older elements after this one, up to the head.
    virtual ~Timestamp();

    /// Links this element before `head` (null: alone) and makes it the head.
    void addToChain(Timestamp* head);
    /// On the head: returns the number of events later than `period` seconds ago and deletes the
    /// others, but never the head. Returns -1 on any other element.
    long countEvents(long period);
    /// Does the same as of `now`, in seconds since the epoch.
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

    // Events may arrive out of order. The lows of a chain are its head and each element whose time
    // is earlier than those of all newer elements. The newest event that has left a period is a
    // low, and so are the lows after it that have left it too. This lets a busy situation count its
    // events without walking over them.
    std::int64_t m_number = 0;       ///< increases from the oldest to the head
    Timestamp* m_olderLow = nullptr; ///< on a low
    Timestamp* m_newerLow = nullptr; ///< on a low
    Timestamp* m_oldestLow = this;   ///< on the head
};

} // namespace zrm

#endif
