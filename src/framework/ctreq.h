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

/// One open request on a table: a situation or a report. Tables derive from it. The framework
/// creates one through TableManager::CreateCtreq and destroys it. The agent's threads use it only
/// under the table manager's lock and pinned by UseHandle.
class ctreq {
public:
    /// The framework owns all three; they outlive the object.
    ctreq(RequestDetail* detail, ContextInfo* context, TableManager* manager);
    ctreq(const ctreq&) = delete;
    ctreq& operator=(const ctreq&) = delete;

    // The virtual functions are in slot order.

    /// Dumps the object to the trace.
    virtual void PrintSelf();
    /// Produces the rows of one sample.
    virtual void TakeSample() = 0;
    /// The number of columns of the table.
    virtual int NumColumns();
    /// Describes column `index`. Returns 0 or a status.
    virtual unsigned GetColumnInfo(ColumnInfo* info, int index);
    virtual unsigned ExecuteCommand(char* command, int length, char* result);
    virtual ~ctreq();
    /// Copies one row into the data array. A non-zero status ends the current pass.
    virtual unsigned InsertRow(char* row);
    /// Non-zero if the row meets the request's conditions.
    virtual unsigned CheckForException(char* row);
    /// Non-zero if comparing the row's named column with the value yields true.
    virtual unsigned ColumnIsException(char* row, char* column, _IntfOper op, char* value);
    virtual void CommandCompleted(CtreqAutomationCapsule* capsule);

    /// Returns 0 and the address of the next condition, or non-zero at the end.
    unsigned GetFilterInfo(SEL1_FILTERINFO** filter);
    /// Restarts the iteration over the conditions.
    void ResetFilterIndex();
    /// Compares a character column of `width` bytes with a terminated text. Ignores the padding of
    /// both.
    int IsException(_IntfOper op, const char* column, const char* value, int width);
    /// Compares an integer column with an 8-byte number in host order, which may be unaligned.
    int IsException(_IntfOper op, int column, const char* value);
    /// True if the row meets the request's conditions. Unlike CheckForException, leaves nothing
    /// behind: it was judged before.
    bool MeetsConditions(char* row);
    /// For how many seconds before a log's stored position the situation's opener counts entries
    /// itself, beside the thresholds. 0: it counts none.
    std::int64_t EarlierPeriod() const;
    /// Gives the opener a row that meets the conditions and that an earlier run has judged.
    void CountEarlier(char* row);
    /// Dumps the conditions to the trace.
    void DumpThresholds();
    /// Sends the `count` rows collected so far.
    unsigned Dispatch();
    /// Ends the situation.
    unsigned Stop();
    /// Marks the request as stopped. Reasons: 1 corrupted time-stamp chain, 2 invalid sample type.
    unsigned Stopped(unsigned reason);
    /// Pins the request with this handle until RSC1_Drop. Null if there is none. Any thread.
    static ctreq* UseHandle(unsigned handle);

    const char* name() const noexcept { return m_name; }
    unsigned handle() const noexcept { return m_handle; }
    unsigned identifier() const noexcept { return m_identifier; }
    unsigned sampleType() const noexcept { return m_sampleType; }
    unsigned interval() const noexcept { return m_interval; }
    TableManager* manager() const noexcept { return m_manager; }

    /// What the framework stores with a request; private to the framework.
    class Framework;
    Framework& framework() noexcept { return *m_framework; }

    /// The data array: the rows collected for the next dispatch, `rowSize` bytes each, contiguous.
    char* rows() const noexcept { return m_rows.get(); }
    unsigned count = 0;     ///< rows in the array
    unsigned allocated = 0; ///< rows the array has room for
    unsigned allocSize = 0; ///< rows to grow by when the array is full; set by the table
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
