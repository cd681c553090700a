#include "logtypes/NewestRows.h"

#include <utility>

namespace zrm {

void NewestRows::add(const zrm_rmlogent_data_t& row, FollowedReport::Detail detail) {
    m_bytes += detail.text.size();
    m_rows.push_back({row, std::move(detail)});
    while (m_bytes > FollowedReport::mostDetails) {
        m_isFull = true;
        removeOldest();
    }
    if (m_rows.size() > m_most) {
        removeOldest();
    }
}

void NewestRows::removeOldest() {
    m_bytes -= m_rows.front().detail.text.size();
    m_rows.pop_front();
}

} // namespace zrm
