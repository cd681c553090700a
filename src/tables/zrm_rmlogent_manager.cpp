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
    return trace.result(offerRows<zrm_rmlogent_base>(*this, rows, count));
}
