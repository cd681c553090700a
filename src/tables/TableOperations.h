#ifndef ZRM_TABLE_OPERATIONS_H
#define ZRM_TABLE_OPERATIONS_H

#include "base/LockGuard.h"
#include "framework/LinkedList.h"
#include "framework/TableManager.h"
#include "framework/ctreq.h"
#include "framework/values.h"
#include "tables/TableDescription.h"

#include <atomic>
#include <new>

namespace zrm {

// The common operations of both tables' managers.

/// Walks a table manager's open requests. Use it only while holding the manager's lock.
class CtreqListIter : public LinkedListIter {
public:
    using LinkedListIter::LinkedListIter;
};

/// Creates the table's manager, stores it in `singleton` for the rest of the process and registers
/// it. Returns tableNoManager if memory runs out, else the framework's status.
template <typename Manager>
unsigned registerTable(std::atomic<Manager*>& singleton, const char* table) {
    auto* const manager = new (std::nothrow) Manager("ZRM", table);
    singleton.store(manager, std::memory_order_release);
    if (manager == nullptr) {
        return tableNoManager;
    }
    return TableManager::RegisterWithManager(manager);
}

/// Creates a request object ready for the framework, which owns it. Returns null if memory runs
/// out.
template <typename Agent>
ctreq* createRequest(RequestDetail* detail, ContextInfo* context, TableManager* manager) {
    auto* const agent = new (std::nothrow) Agent(detail, context, manager);
    if (agent != nullptr) {
        agent->TakeSampleConstructor();
    }
    return agent;
}

/// Offers `count` contiguous rows to these requests of a table and dispatches what each one
/// accepts. Returns the last non-zero dispatch status, else 0. The caller holds the lock.
template <typename RowHolder, typename Row>
unsigned offerRowsTo(LinkedList& requests, Row* rows, int count) {
    unsigned status = 0;
    CtreqListIter next(requests);
    while (void* const element = next.Next()) {
        auto* const request = static_cast<RowHolder*>(static_cast<ctreq*>(element));
        const unsigned handle = request->handle();
        ctreq::UseHandle(handle);
        request->AddData(rows, count);
        const unsigned dispatched = request->Dispatch();
        if (dispatched != 0) {
            status = dispatched;
        }
        request->count = 0; // never dispatch the same rows twice
        RSC1_Drop(handle);
    }
    return status;
}

/// Offers the rows to every open request of the table, as above. Any thread; one array of rows at a
/// time.
template <typename RowHolder, typename Row>
unsigned offerRows(TableManager& manager, Row* rows, int count) {
    const LockGuard lock(manager.lock());
    return offerRowsTo<RowHolder>(manager.requests(), rows, count);
}

} // namespace zrm

#endif
