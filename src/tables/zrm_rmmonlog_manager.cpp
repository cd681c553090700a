#include "tables/zrm_rmmonlog_manager.h"

#include "base/TraceScope.h"
#include "tables/TableOperations.h"
#include "tables/zrm_rmmonlog_agent.h"

#include <atomic>

namespace zrm {

namespace {

TRC1_Anchor anchor{"zrm_rmmonlog_manager.cpp"};

/// The table's one manager.
std::atomic<zrm_rmmonlog_manager*> theManager{nullptr};

} // namespace

unsigned zrm_rmmonlog_init() {
    TraceScope trace(anchor);
    return trace.result(registerTable(theManager, "RMMONLOG"));
}

zrm_rmmonlog_manager::zrm_rmmonlog_manager(const char* application, const char* table)
    : TableManager(application, table) {}

ctreq* zrm_rmmonlog_manager::CreateCtreq(RequestDetail* detail, ContextInfo* context) {
    TraceScope trace(anchor);
    return trace.result(createRequest<zrm_rmmonlog_agent>(detail, context, this));
}

unsigned zrm_rmmonlog_manager::EventArrived(zrm_rmmonlog_data_t* rows, int count) {
    TraceScope trace(anchor);
    zrm_rmmonlog_manager* const manager = theManager.load(std::memory_order_acquire);
    return trace.result(manager == nullptr ? 0U : manager->AddDataToEvent(rows, count));
}

unsigned zrm_rmmonlog_manager::AddDataToEvent(zrm_rmmonlog_data_t* rows, int count) {
    TraceScope trace(anchor);
    return trace.result(offerRows<zrm_rmmonlog_base>(*this, rows, count));
}

} // namespace zrm
