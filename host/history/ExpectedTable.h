#ifndef ZRM_HOST_EXPECTED_TABLE_H
#define ZRM_HOST_EXPECTED_TABLE_H

#include "host/events/ExpectedGroups.h"
#include "host/history/Statement.h"

namespace zrm::host {

/// The groups from which situations expect entries, and the watched time. Used by the writer's
/// thread. Throws DatabaseError.
class ExpectedTable {
public:
    explicit ExpectedTable(Database& database);

    void keep(const ExpectedValues& values);

    static ExpectedValues read(Database& database);

private:
    Statement m_forget;
    Statement m_keep;
    Statement m_watched;
};

} // namespace zrm::host

#endif
