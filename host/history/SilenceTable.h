#ifndef ZRM_HOST_SILENCE_TABLE_H
#define ZRM_HOST_SILENCE_TABLE_H

#include "host/history/Statement.h"
#include "host/silences/Silences.h"

#include <cstdint>
#include <vector>

namespace zrm::host {

/// The silences as stored in the history. Used by one thread at a time. Throws DatabaseError.
class SilenceTable {
public:
    explicit SilenceTable(Database& database);

    /// Stores a silence. One that is there keeps its count.
    void keep(const Silence& silence);

    /// Adds to the count of a silence.
    void count(const SilencedEvents& events);

    void remove(const std::vector<std::uint64_t>& ids);

    /// All of them. A damaged one is left out, and named on standard error.
    static KeptSilences read(Database& database);

private:
    Statement m_keep;
    Statement m_count;
    Statement m_remove;
};

} // namespace zrm::host

#endif
