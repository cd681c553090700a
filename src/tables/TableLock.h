#ifndef ZRM_TABLE_LOCK_H
#define ZRM_TABLE_LOCK_H

#include "framework/TableManager.h"

namespace zrm {

/// Holds a table manager's lock. Lives on the stack of one thread.
class TableLock {
public:
    explicit TableLock(TableManager& manager) : m_lock(manager.lock()) { SYS1_GetLock(m_lock); }
    ~TableLock() { SYS1_ReleaseLock(m_lock); }
    TableLock(const TableLock&) = delete;
    TableLock& operator=(const TableLock&) = delete;

private:
    SYS1_Lock* m_lock;
};

} // namespace zrm

#endif
