#ifndef ZRM_FRAMEWORK_TABLE_MANAGER_H
#define ZRM_FRAMEWORK_TABLE_MANAGER_H

#include "framework/LinkedList.h"
#include "framework/locks.h"

#include <memory>

class ContextInfo;
class RequestDetail;
class ctreq;

/// Base of each table's manager: knows the table's names and its open situations.
class TableManager {
public:
    /// Both names are static texts.
    TableManager(const char* application, const char* table);
    TableManager(const TableManager&) = delete;
    TableManager& operator=(const TableManager&) = delete;

    // The virtual operations stand in slot order.

    virtual ~TableManager();
    virtual unsigned Shutdown(unsigned reason);
    /// Creates the request object of a new situation or report; the framework owns it. Called
    /// without the manager's lock.
    virtual ctreq* CreateCtreq(RequestDetail* detail, ContextInfo* context) = 0;

    /// Makes a table known to the framework; returns 0 or a status. The manager lives until the
    /// process ends.
    static unsigned RegisterWithManager(TableManager* manager);

    const char* application() const noexcept { return m_application; }
    const char* table() const noexcept { return m_table; }
    /// Guards requests() and serialises the delivery of events.
    SYS1_Lock* lock() noexcept { return &m_lock; }
    /// The open situations (ctreq*); only while lock() is held.
    LinkedList& requests() noexcept { return m_requests; }
    /// Those of requests() that one fresh row of `rowSize` bytes may concern, in the same order:
    /// each request that is left out would refuse the row for a condition on one of its character
    /// columns. A framework that knows nothing of the kind returns requests(). Only while lock() is
    /// held, and valid until the next call.
    LinkedList& requestsFor(char* row, unsigned rowSize);

private:
    class Framework; ///< what the framework keeps with a table

    const char* m_application;
    const char* m_table;
    SYS1_Lock m_lock;
    LinkedList m_requests;
    std::unique_ptr<Framework> m_framework;
};

#endif
