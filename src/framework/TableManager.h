#ifndef ZRM_FRAMEWORK_TABLE_MANAGER_H
#define ZRM_FRAMEWORK_TABLE_MANAGER_H

#include "framework/LinkedList.h"
#include "framework/locks.h"

#include <memory>

class ContextInfo;
class RequestDetail;
class ctreq;

/// Base class of each table's manager. Holds the table's names and its open situations.
class TableManager {
public:
    /// Both names must be static texts.
    TableManager(const char* application, const char* table);
    TableManager(const TableManager&) = delete;
    TableManager& operator=(const TableManager&) = delete;

    // The virtual functions are in slot order.

    virtual ~TableManager();
    virtual unsigned Shutdown(unsigned reason);
    /// Creates the request object for a new situation or report. The framework owns it. Called
    /// without the manager's lock.
    virtual ctreq* CreateCtreq(RequestDetail* detail, ContextInfo* context) = 0;

    /// Registers a table with the framework. Returns 0 or a status. The manager must live until the
    /// process ends.
    static unsigned RegisterWithManager(TableManager* manager);

    const char* application() const noexcept { return m_application; }
    const char* table() const noexcept { return m_table; }
    /// Guards requests() and serialises event delivery.
    SYS1_Lock* lock() noexcept { return &m_lock; }
    /// The open situations (ctreq*). Use only while holding lock().
    LinkedList& requests() noexcept { return m_requests; }
    /// The members of requests() that one new row of `rowSize` bytes may concern, in the same
    /// order. Each request left out would reject the row because of a condition on one of its
    /// character columns. A framework without such an index returns requests(). Use only while
    /// holding lock(); valid until the next call.
    LinkedList& requestsFor(char* row, unsigned rowSize);

private:
    class Framework; ///< what the framework stores with a table

    const char* m_application;
    const char* m_table;
    SYS1_Lock m_lock;
    LinkedList m_requests;
    std::unique_ptr<Framework> m_framework;
};

#endif
