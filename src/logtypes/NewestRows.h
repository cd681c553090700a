#ifndef ZRM_NEWEST_ROWS_H
#define ZRM_NEWEST_ROWS_H

#include "logtypes/FollowedReport.h"

#include <cstddef>
#include <deque>

namespace zrm {

/// The newest rows of a file that is read from its beginning on, with their details. Bounded in
/// number and in bytes: the oldest go first. One thread.
class NewestRows {
public:
    struct Kept {
        zrm_rmlogent_data_t row;
        FollowedReport::Detail detail;
    };

    /// `most`: rows, at least 1.
    explicit NewestRows(std::size_t most) : m_most(most) {}

    void add(const zrm_rmlogent_data_t& row, FollowedReport::Detail detail);

    /// True if the details left no room for all rows that were wanted.
    bool isFull() const noexcept { return m_isFull && m_rows.size() < m_most; }
    /// The oldest first.
    const std::deque<Kept>& rows() const noexcept { return m_rows; }

private:
    void removeOldest();

    const std::size_t m_most;
    std::deque<Kept> m_rows;
    std::size_t m_bytes = 0; ///< of details
    bool m_isFull = false;
};

} // namespace zrm

#endif
