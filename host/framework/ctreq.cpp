#include "framework/ctreq.h"

#include "base/TraceScope.h"
#include "framework/TableManager.h"
#include "host/framework/HandleTable.h"
#include "host/framework/RequestState.h"
#include "host/framework/Status.h"

#include <algorithm>
#include <atomic>
#include <cstdint>
#include <cstring>
#include <new>

using namespace zrm;
using namespace zrm::host;

namespace {

TRC1_Anchor anchor{"ctreq.cpp"};

std::atomic<unsigned> g_lastIdentifier{0};

} // namespace

ctreq::ctreq(RequestDetail* detail, ContextInfo* context, TableManager* manager)
    : m_manager(manager), m_name(detail->name.c_str()), m_sampleType(detail->sampleType),
      m_interval(detail->interval), m_identifier(++g_lastIdentifier),
      m_handle(HandleTable::open(this)),
      m_framework(std::make_unique<Framework>(*detail, *context)) {}

ctreq::~ctreq() {
    HandleTable::close(m_handle);
}

void ctreq::PrintSelf() {
    TraceScope trace(anchor);
    if (trace.isOn(TRC1_DETAIL)) {
        trace.detail()("ctreq @%p <%u,%u>\n", static_cast<void*>(this), m_identifier, m_handle);
        DumpThresholds();
    }
}

int ctreq::NumColumns() {
    return 0;
}

unsigned ctreq::GetColumnInfo(ColumnInfo* /*info*/, int /*index*/) {
    return Status::invalidArgument;
}

unsigned ctreq::ExecuteCommand(char* /*command*/, int /*length*/, char* /*result*/) {
    return Status::notSupported;
}

unsigned ctreq::InsertRow(char* row) {
    if (rowSize == 0) {
        return Status::invalidArgument;
    }
    if (count >= allocated) {
        // Room is counted in steps of allocSize, but the memory doubles, so that a large report is
        // not copied for every few rows.
        const std::size_t room = std::size_t{allocated} + std::max(allocSize, 1u);
        if (room > m_framework->capacity) {
            const std::size_t capacity = std::max(room, m_framework->capacity * 2);
            std::unique_ptr<char[]> grown(new (std::nothrow) char[capacity * rowSize]);
            if (grown == nullptr) {
                return Status::noMemory;
            }
            std::copy_n(m_rows.get(), std::size_t{count} * rowSize, grown.get());
            m_rows = std::move(grown);
            m_framework->capacity = capacity;
        }
        allocated = static_cast<unsigned>(room);
    }
    std::memcpy(m_rows.get() + std::size_t{count} * rowSize, row, rowSize);
    ++count;
    return Status::ok;
}

unsigned ctreq::CheckForException(char* row) {
    if (m_framework->stopped.load(std::memory_order_relaxed)) {
        return 0;
    }
    m_framework->counts.countJudged();
    if (!m_framework->conditionsOf(*this).holds(row)) {
        return 0;
    }
    m_framework->counts.countMatched();
    return 1;
}

bool ctreq::MeetsConditions(char* row) {
    return !m_framework->stopped.load(std::memory_order_relaxed) &&
           m_framework->conditionsOf(*this).holds(row);
}

std::int64_t ctreq::EarlierPeriod() const {
    return m_framework->receiver.earlierPeriod();
}

void ctreq::CountEarlier(char* row) {
    m_framework->receiver.receiveEarlier(*this, row);
}

unsigned ctreq::ColumnIsException(char* /*row*/, char* /*column*/, _IntfOper /*op*/,
                                  char* /*value*/) {
    return 0;
}

void ctreq::CommandCompleted(CtreqAutomationCapsule* /*capsule*/) {}

unsigned ctreq::GetFilterInfo(SEL1_FILTERINFO** filter) {
    SEL1_FILTERINFO* const next = m_framework->filters.next();
    if (next == nullptr) {
        return Status::end;
    }
    *filter = next;
    return Status::ok;
}

void ctreq::ResetFilterIndex() {
    m_framework->filters.reset();
}

int ctreq::IsException(_IntfOper op, const char* column, const char* value, int width) {
    const SEL1_FILTERINFO filter{"", op, SEL1_CHARACTER,
                                 static_cast<std::int16_t>(std::strlen(value)), value};
    const RowColumn described{"", 0, static_cast<std::size_t>(width), COLUMN_CHARACTER};
    return CompiledCondition(filter, &described).holds(this, const_cast<char*>(column)) ? 1 : 0;
}

int ctreq::IsException(_IntfOper op, int column, const char* value) {
    const bool isList = op == INTF_IN;
    const SEL1_FILTERINFO filter{"", op, isList ? SEL1_CHARACTER : SEL1_INTEGER,
                                 static_cast<std::int16_t>(isList ? std::strlen(value) : 8), value};
    const RowColumn described{"", 0, sizeof column, COLUMN_INTEGER};
    return CompiledCondition(filter, &described).holds(this, reinterpret_cast<char*>(&column)) ? 1
                                                                                               : 0;
}

void ctreq::DumpThresholds() {
    for (const SEL1_FILTERINFO& filter : m_framework->filters.all()) {
        if (filter.dataType == SEL1_INTEGER) {
            std::int64_t number;
            std::memcpy(&number, filter.value, sizeof number);
            TRC1_Printf(anchor, __LINE__, "\t_filter %s op=%d value=%lld\n", filter.columnName,
                        filter.compareOperator, static_cast<long long>(number));
        } else {
            TRC1_Printf(anchor, __LINE__, "\t_filter %s op=%d value=\"%.*s\"\n", filter.columnName,
                        filter.compareOperator, filter.valueLength, filter.value);
        }
    }
}

unsigned ctreq::Dispatch() {
    return count == 0 ? Status::ok : m_framework->receiver.receive(*this, m_rows.get(), count);
}

unsigned ctreq::Stop() {
    m_framework->stopped = true;
    return Status::ok;
}

unsigned ctreq::Stopped(unsigned reason) {
    if (!m_framework->stopped.exchange(true)) {
        m_framework->receiver.stopped(*this, reason);
    }
    return Status::ok;
}

ctreq* ctreq::UseHandle(unsigned handle) {
    return HandleTable::pin(handle);
}
