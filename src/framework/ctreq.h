#ifndef ZRM_FRAMEWORK_CTREQ_H
#define ZRM_FRAMEWORK_CTREQ_H

#include "framework/filters.h"

#include <cstdint>
#include <memory>

class ContextInfo;
class CtreqAutomationCapsule;
class RequestDetail;
class TableManager;

/// Kinds of request.
enum SampleType : unsigned {
    SAMPLE_REPORT = 3,    ///< rows on demand, through TakeSample
    SAMPLE_SITUATION = 4, ///< rows pushed by events
};

/// One open request on a table: a situation or a report. Tables derive from it; the framework
/// creates one through TableManager::CreateCtreq, and destroys it. The agent's threads use it only
/// under the table manager's lock and pinned by UseHandle.
class ctreq {
public:
    /// All three are the framework's and outlive the object.
    ctreq(RequestDetail* detail, ContextInfo* context, TableManager* manager);
    ctreq(const ctreq&) = delete;
    ctreq& operator=(const ctreq&) = delete;

    // The virtual operations stand in slot order.

    /// Dumps the object to the trace.
    virtual void PrintSelf();
    /// Produces the rows of one sample.
    virtual void TakeSample() = 0;
    /// Number of columns of the table.
    virtual int NumColumns();
    /// Describes column `index`; returns 0 or a status.
    virtual unsigned GetColumnInfo(ColumnInfo* info, int index);
    virtual unsigned ExecuteCommand(char* command, int length, char* result);
    virtual ~ctreq();
    /// Copies one row into the data array; a non-zero status stops further inserts of the pass.
    virtual unsigned InsertRow(char* row);
    /// Non-zero when the row meets the request's conditions.
    virtual unsigned CheckForException(char* row);
    /// Non-zero when the named column of the row compares true against the value.
    virtual unsigned ColumnIsException(char* row, char* column, _IntfOper op, char* value);
    virtual void CommandCompleted(CtreqAutomationCapsule* capsule);

    /// Delivers the next condition: 0 and its address, or non-zero at the end.
    unsigned GetFilterInfo(SEL1_FILTERINFO** filter);
    /// Starts the walk over the conditions afresh.
    void ResetFilterIndex();
    /// Compares a character column of `width` bytes with a terminated text, neither's padding
    /// counting.
    int IsException(_IntfOper op, const char* column, const char* value, int width);
    /// Compares an integer column with a number of 8 bytes in host order, perhaps unaligned.
    int IsException(_IntfOper op, int column, const char* value);
    /// Dumps the conditions to the trace.
    void DumpThresholds();
    /// Sends the rows collected so far (`count` of them).
    unsigned Dispatch();
    /// Ends the situation.
    unsigned Stop();
    /// Marks the request as stopped; reasons: 1 corrupted time-stamp chain, 2 invalid sample type.
    unsigned Stopped(unsigned reason);
    /// Pins the request of this handle until RSC1_Drop; null when there is none. Any thread.
    static ctreq* UseHandle(unsigned handle);

    const char* name() const noexcept { return m_name; }
    unsigned handle() const noexcept { return m_handle; }
    unsigned identifier() const noexcept { return m_identifier; }
    unsigned sampleType() const noexcept { return m_sampleType; }
    unsigned interval() const noexcept { return m_interval; }
    TableManager* manager() const noexcept { return m_manager; }

    /// What the framework keeps with a request: the framework's own matter.
    class Framework;
    Framework& framework() noexcept { return *m_framework; }

    /// The data array: rows collected for the next dispatch, `rowSize` bytes each, back to back.
    char* rows() const noexcept { return m_rows.get(); }
    unsigned count = 0;     ///< rows held
    unsigned allocated = 0; ///< rows for which room exists
    unsigned allocSize = 0; ///< rows of room added each time it runs out; set by the table
    unsigned rowSize = 0;   ///< bytes; set by the table

private:
    TableManager* m_manager;
    const char* m_name;
    unsigned m_sampleType;
    unsigned m_interval;
    unsigned m_identifier;
    unsigned m_handle;
    std::unique_ptr<char[]> m_rows;
    std::unique_ptr<Framework> m_framework;
};

#endif
