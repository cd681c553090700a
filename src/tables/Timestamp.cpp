#include "tables/Timestamp.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>

namespace zrm {

namespace {

TRC1_Anchor anchor{"Timestamp.cpp"};

constexpr std::size_t stampLength = 16;

/// A number in the stamp and the tm member that it belongs to.
struct StampPart {
    std::size_t begin;
    std::size_t end;
    int std::tm::*field;
    int offset; ///< added to the number
};

// From last to first, because each number is terminated by cutting off the text after it. The
// century digit and the year together are the years since 1900.
constexpr StampPart stampParts[] = {
    {11, 13, &std::tm::tm_sec, 0}, {9, 11, &std::tm::tm_min, 0}, {7, 9, &std::tm::tm_hour, 0},
    {5, 7, &std::tm::tm_mday, 0},  {3, 5, &std::tm::tm_mon, -1}, {0, 3, &std::tm::tm_year, 0},
};

/// Reads the numbers of a stamp up to the first one that sets errno.
std::tm partsOf(const char* stamp) {
    char text[stampLength + 1];
    std::memcpy(text, stamp, sizeof text);
    std::tm parts{};
    parts.tm_isdst = -1;
    for (const StampPart& part : stampParts) {
        text[part.end] = '\0';
        parts.*part.field = std::atoi(text + part.begin) + part.offset;
        if (errno != 0) {
            break;
        }
    }
    return parts;
}

} // namespace

Timestamp::Timestamp(Timestamp** pHeadOfChain, long newTime) : m_eventTime(newTime) {
    TraceScope trace(anchor);
    addToChain(*pHeadOfChain);
    *pHeadOfChain = this;
}

Timestamp::Timestamp(Timestamp** pHeadOfChain, const char* pNewTime) {
    TraceScope trace(anchor);
    addToChain(nullptr);
    char stamp[stampLength + 1];
    std::memcpy(stamp, pNewTime, stampLength);
    stamp[stampLength] = '\0';
    trace.fine()("timestamp passed: sec %.2s, min %.2s, hour %.2s, mday %.2s, mon %.2s, year %.2s, "
                 "century %.1s",
                 stamp + 11, stamp + 9, stamp + 7, stamp + 5, stamp + 3, stamp + 1, stamp);

    errno = 0;
    std::tm parts = partsOf(stamp);
    int cause = errno;
    m_eventTime = std::mktime(&parts);
    if (m_eventTime >= 0) {
        addToChain(*pHeadOfChain);
        *pHeadOfChain = this;
    } else if (cause == 0) {
        cause = errno;
    }
    if (cause != 0 || m_eventTime < 0) {
        const ErrorText error(cause);
        trace.error()("Error converting timestamp %s to UNIX time format. errno = %d; %s, "
                      "m_eventTime %d",
                      stamp, error.number(), error.text(), static_cast<int>(m_eventTime));
    }
}

Timestamp::~Timestamp() {
    TraceScope trace(anchor);
    // A loop, not a recursion: a busy situation's chain may hold more events than there is stack
    // space for.
    Timestamp* older = m_next;
    while (older != nullptr && !older->m_isHeadOfChain) {
        Timestamp* const next = older->m_next;
        older->m_next = nullptr;
        delete older;
        older = next;
    }
}

void Timestamp::addToChain(Timestamp* head) {
    TraceScope trace(anchor);
    if (head == nullptr) {
        m_next = this;
        m_prev = this;
        m_oldestLow = this;
    } else {
        Timestamp* const oldest = head->m_prev;
        m_next = head;
        m_prev = oldest;
        oldest->m_next = this;
        head->m_prev = this;
        head->m_isHeadOfChain = false;

        m_number = head->m_number + 1;
        m_olderLow = head;
        while (m_olderLow != nullptr && m_olderLow->m_eventTime >= m_eventTime) {
            m_olderLow = m_olderLow->m_olderLow;
        }
        m_oldestLow = m_olderLow != nullptr ? head->m_oldestLow : this;
        if (m_olderLow != nullptr) {
            m_olderLow->m_newerLow = this;
        }
    }
    m_isHeadOfChain = true;
}

long Timestamp::countEvents(long period) {
    return countEvents(period, std::time(nullptr));
}

long Timestamp::countEvents(long period, std::int64_t now) {
    TraceScope trace(anchor);
    if (!m_isHeadOfChain) {
        trace.error()("Error: Function not invoked from head-of-chain");
        return trace.result(-1L);
    }
    long cutOff = static_cast<long>(now) - period;
    if (cutOff < 0) {
        cutOff = 0;
    }

    Timestamp* const out = newestOut(cutOff);
    if (out == nullptr) {
        const Timestamp* const oldest = m_prev;
        return trace.result(static_cast<long>(m_number - oldest->m_number + 1));
    }
    const auto count = static_cast<long>(m_number - out->m_number);
    prune(*out);
    return trace.result(count);
}

/// On the head: the newest element not later than the cut-off, or null if all are later.
Timestamp* Timestamp::newestOut(long cutOff) const {
    Timestamp* out = nullptr;
    for (Timestamp* low = m_oldestLow; low != nullptr && low->m_eventTime <= cutOff;
         low = low->m_newerLow) {
        out = low;
    }
    return out;
}

/// On the head: deletes this element and the older ones, but never the head.
void Timestamp::prune(Timestamp& newestOut) {
    m_oldestLow = &newestOut == this ? this : newestOut.m_newerLow;
    m_oldestLow->m_olderLow = nullptr;
    Timestamp* const first = &newestOut == this ? m_next : &newestOut;
    m_prev = first->m_prev;
    m_prev->m_next = this;
    if (first != this) {
        delete first;
    }
}

} // namespace zrm
