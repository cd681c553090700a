#ifndef ZRM_HOST_JOURNAL_JOIN_H
#define ZRM_HOST_JOURNAL_JOIN_H

#include "host/sources/JournalLine.h"
#include "logs/LineJoin.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <set>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace zrm::host {

/// Joins the lines that a writer has written to a journal one by one, although those of others are
/// between them. Entries are given in the order of their first lines; what comes after one that
/// waits for further lines waits, too. Bounded: an entry waits no longer than its limits say, and
/// not for more than `mostLines` lines or `mostBytes` bytes. One thread.
class JournalJoin {
public:
    using Clock = std::chrono::steady_clock;

    static constexpr std::size_t mostLines = 4096;
    static constexpr std::size_t mostBytes = 16 * 1024 * 1024;

    /// The cursor of a position, behind which reading goes on.
    static std::string cursorOf(const std::string& position);

    /// The rules outlive the object.
    explicit JournalJoin(const LineJoin& join) : m_join(join) {}

    /// Begins behind a position, as position() or the journal gives it.
    void begin(const std::string& position);
    /// These lines, whose ids are given, have been in entries already.
    void passOver(std::set<std::string, std::less<>> ids) { m_consumed = std::move(ids); }
    bool hasBegun() const noexcept { return !m_reached.empty(); }

    /// The next line of the journal.
    void add(JournalLine line, Clock::time_point now);
    /// The next entry that is complete; null if there is none yet. `isOver`: nothing more comes.
    /// Valid until the next call.
    const JournalEntry* next(Clock::time_point now, bool isOver = false);
    /// Behind the entry that was given last: the cursor behind which all lines are still to be
    /// given, and the ids of those that have been.
    std::string position() const;
    /// Takes the entry back that was given last. Nothing is given any more.
    void takeBack();
    /// How long until an entry may be complete without further lines.
    std::chrono::milliseconds patience(Clock::time_point now, std::chrono::milliseconds most) const;

private:
    struct Item {
        JournalEntry entry;     ///< of a continuing line only the cursor
        bool isFirst = true;    ///< of its entry
        std::uint64_t owner{0}; ///< of a continuing line: the number of its entry's first line
        // Of an entry.
        bool isOpen = false; ///< more lines may continue it
        std::size_t lines = 1;
        std::size_t last = 0;     ///< where the last line begins
        std::uint64_t lastTime{}; ///< of the last line
        Clock::time_point seen{}; ///< when that was added
        std::size_t size = 0;     ///< bytes
    };

    Item& itemOf(std::uint64_t number) { return m_items[number - m_first]; }
    bool takes(const Item& item, const JournalLine& line) const;
    bool isConsumed(const Item& item) const noexcept {
        return !item.isFirst && item.owner <= m_given;
    }
    bool isComplete(const Item& head, Clock::time_point now) const;
    void append(Item& item, const JournalLine& line, Clock::time_point now);
    void push(Item item);
    void pop();

    const LineJoin& m_join;
    std::string m_reached;                         ///< cursor: all lines up to this one were given
    std::set<std::string, std::less<>> m_consumed; ///< ids of lines that an earlier run has given
    std::deque<Item> m_items;                      ///< behind m_reached
    std::uint64_t m_first = 1;                     ///< number of the first of them
    std::uint64_t m_given = 0;  ///< number of the line with which the last entry began
    std::size_t m_bytes = 0;    ///< of all items
    std::uint64_t m_latest = 0; ///< time of the newest line
    std::unordered_map<std::string, std::uint64_t> m_open; ///< writers, and their open entries
    // To take the last entry back.
    std::vector<Item> m_popped;
    std::string m_reachedBefore;
    std::uint64_t m_givenBefore = 0;
};

} // namespace zrm::host

#endif
