#ifndef ZRM_HOST_ENTRY_FILTER_H
#define ZRM_HOST_ENTRY_FILTER_H

#include "host/framework/Condition.h"
#include "host/framework/RowLayout.h"

#include <memory>
#include <optional>
#include <vector>

class TableManager;

namespace zrm {
struct zrm_rmlogent_data_t;
} // namespace zrm

namespace zrm::host {

/// Judges rows of Log Entries by conditions, with the very code that judges those of situations. A
/// request of the table that no log offers anything to. One thread.
class EntryFilter {
public:
    /// The table's manager outlives the object.
    EntryFilter(std::vector<Condition> conditions, TableManager& entries);
    ~EntryFilter();
    EntryFilter(const EntryFilter&) = delete;
    EntryFilter& operator=(const EntryFilter&) = delete;

    /// False if the table gave no request; nothing else may be called then.
    bool isOpen() const noexcept { return m_request != nullptr; }
    const RowLayout& layout() const { return *m_layout; }
    /// True if every condition holds.
    bool meets(zrm_rmlogent_data_t& row);

private:
    class Request;
    struct Surroundings;

    std::unique_ptr<Surroundings> m_surroundings;
    std::unique_ptr<Request> m_request;
    std::optional<RowLayout> m_layout;
};

} // namespace zrm::host

#endif
