#include "tables/zrm_rmlogent_manager.h"

#include "agent/TraceScope.h"
#include "tables/TableOperations.h"
#include "tables/zrm_rmlogent_agent.h"

#include <atomic>

namespace {

TRC1_Anchor anchor{"zrm_rmlogent_manager.cpp"};

/// The table's one manager. The logs' threads read it from before the table is registered.
std::atomic<zrm_rmlogent_manager*> theManager{nullptr};

} // namespace

unsigned zrm_rmlogent_init() {
    TraceScope trace(anchor);
    return trace.result(registerTable(theManager, "RMLOGENT"));
}

zrm_rmlogent_manager::zrm_rmlogent_manager(const char* application, const char* table)
    : TableManager(application, table) {}

ctreq* zrm_rmlogent_manager::CreateCtreq(RequestDetail* detail, ContextInfo* context) {
    TraceScope trace(anchor);
    return trace.result(createRequest<zrm_rmlogent_agent>(detail, context, this));
}

unsigned zrm_rmlogent_manager::EventArrived(zrm_rmlogent_data_t* rows, int count) {
    TraceScope trace(anchor);
    zrm_rmlogent_manager* const manager = theManager.load(std::memory_order_acquire);
    return trace.result(manager == nullptr ? 0U : manager->AddDataToEvent(rows, count));
}

unsigned zrm_rmlogent_manager::AddDataToEvent(zrm_rmlogent_data_t* rows, int count) {
    TraceScope trace(anchor);
    const TableLock lock(*this);
    if (count != 1 || zrm_rmlogent_agent::isTraced()) {
        return trace.result(offerRowsTo<zrm_rmlogent_base>(requests(), rows, count));
    }
    LinkedList& concerned = requestsFor(reinterpret_cast<char*>(rows), sizeof *rows);
    const unsigned status = offerRowsTo<zrm_rmlogent_base>(concerned, rows, count);
    // The row keeps the thresholds of the last request, whether that was passed over or not.
    void* const last = requests().Last();
    if (last != concerned.Last()) {
        static_cast<zrm_rmlogent_agent*>(static_cast<ctreq*>(last))->writeThresholds(rows, count);
    }
    return trace.result(status);
}
