#include "tables/zrm_rmlogent_manager.h"

#include "base/TraceScope.h"
#include "framework/EventRoom.h"
#include "tables/TableOperations.h"
#include "tables/zrm_rmlogent_agent.h"

#include <algorithm>
#include <atomic>

namespace zrm {

namespace {

TRC1_Anchor anchor{"zrm_rmlogent_manager.cpp"};

/// The table's one manager. The logs' threads may read it before the table is registered.
std::atomic<zrm_rmlogent_manager*> theManager{nullptr};

/// Calls the function with each open situation, under the manager's lock.
template <typename Function> void forEachSituation(const Function& function) {
    zrm_rmlogent_manager* const manager = theManager.load(std::memory_order_acquire);
    if (manager == nullptr) {
        return;
    }
    const LockGuard guard(manager->lock());
    CtreqListIter next(manager->requests());
    while (void* const element = next.Next()) {
        function(*static_cast<zrm_rmlogent_agent*>(static_cast<ctreq*>(element)));
    }
}

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
    const LockGuard guard(lock());
    // Checked under the lock, so that at most one row's events exceed the room.
    if (!EventRoom::mayOffer()) {
        return trace.result(tableNoRoom);
    }
    if (count != 1 || areOffersTraced()) {
        return trace.result(offerRowsTo<zrm_rmlogent_base>(requests(), rows, count));
    }
    LinkedList& concerned = requestsFor(reinterpret_cast<char*>(rows), sizeof *rows);
    void* const lastConcerned = concerned.Last();
    unsigned status = 0;
    if (lastConcerned != nullptr) {
        status = offerRowsTo<zrm_rmlogent_base>(concerned, rows, count);
    }
    // The row keeps the thresholds of the last request, even if that request was skipped.
    void* const last = requests().Last();
    if (last != lastConcerned) {
        static_cast<zrm_rmlogent_agent*>(static_cast<ctreq*>(last))->writeThresholds(rows, count);
    }
    return trace.result(status);
}

std::int64_t zrm_rmlogent_manager::LongestPeriod(zrm_rmlogent_data_t& row) {
    TraceScope trace(anchor);
    std::int64_t longest = 0;
    forEachSituation(
        [&](zrm_rmlogent_agent& agent) { longest = std::max(longest, agent.periodOn(row)); });
    return trace.result(longest);
}

void zrm_rmlogent_manager::CountEarlier(zrm_rmlogent_data_t& row) {
    TraceScope trace(anchor);
    forEachSituation([&](zrm_rmlogent_agent& agent) { agent.countEarlier(row); });
}

/// True if the trace shows to which requests a row is offered. That involves several source files,
/// so the answer is cached until a level changes. It is not cached while levels differ between
/// threads, because then no anchor stores one.
bool zrm_rmlogent_manager::areOffersTraced() {
    const unsigned generation = anchor.generation.load(std::memory_order_acquire);
    if (generation != TRC1_Generation.load(std::memory_order_relaxed)) {
        return zrm_rmlogent_agent::isTraced();
    }
    if (generation != m_traceGeneration) {
        m_areOffersTraced = zrm_rmlogent_agent::isTraced();
        m_traceGeneration = generation;
    }
    return m_areOffersTraced;
}

} // namespace zrm
