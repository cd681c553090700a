#ifndef ZRM_HOST_JOURNAL_JOIN_BACK_H
#define ZRM_HOST_JOURNAL_JOIN_BACK_H

#include "host/sources/JournalLine.h"
#include "logs/LineJoin.h"

#include <cstddef>
#include <cstdint>
#include <deque>
#include <limits>
#include <set>
#include <string>
#include <unordered_map>
#include <vector>

namespace zrm::host {

/// Joins the lines of a journal that is read backwards as JournalJoin joins them: whether a line
/// continues another is known when an older one of the same writer is met, or when none can follow
/// in time. Entries are given newest first, by their first lines. Bounded as JournalJoin is. One
/// thread.
class JournalJoinBack {
public:
    /// The rules outlive the object.
    explicit JournalJoinBack(const LineJoin& join) : m_join(join) {}

    /// The next older line.
    void add(JournalLine line);
    /// The next older entry; null if further lines are needed to know it. `isOver`: there are none.
    /// Valid until the next call.
    const JournalEntry* previous(bool isOver);
    /// Ids of the lines that belong to entries which have not been given yet.
    std::set<std::string, std::less<>> waiting() const;

private:
    enum class Kind : unsigned char { unknown, first, further };
    struct Item {
        JournalLine line;
        Kind kind = Kind::unknown;
    };

    bool continues(const JournalLine& older, const JournalLine& line) const;
    bool isDecided(const Item& head, bool isOver) const;
    void take();
    void makeEntries(JournalLine first);

    const LineJoin& m_join;
    std::deque<Item> m_items;  ///< newest first
    std::uint64_t m_first = 0; ///< number of the first of them
    /// Writers, and their oldest lines so far.
    std::unordered_map<std::string, std::uint64_t> m_unknown;
    /// Writers, and the lines that continue an older one, newest first.
    std::unordered_map<std::string, std::vector<JournalLine>> m_further;
    std::size_t m_bytes = 0;                                            ///< of all lines
    std::uint64_t m_oldest = std::numeric_limits<std::uint64_t>::max(); ///< time
    std::vector<JournalEntry> m_ready;                                  ///< oldest first
    JournalEntry m_given;
};

} // namespace zrm::host

#endif
