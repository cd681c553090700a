#include "TestRequest.h"

#include "base/TraceScope.h"
#include "framework/TableManager.h"
#include "host/framework/Tables.h"

#include <algorithm>
#include <cstring>
#include <map>

using namespace zrm;
using namespace zrm::host;

namespace {

TRC1_Anchor anchor{"TestRequest.cpp"};

unsigned lastHandle = 1000;

std::map<unsigned, ctreq*>& liveRequests() {
    static std::map<unsigned, ctreq*> requests;
    return requests;
}

void record(TestRequest& test, const std::string& call) {
    test.calls.push_back(call);
    TestCalls::all().push_back(test.name + " " + call);
}

} // namespace

std::vector<std::string>& TestCalls::all() {
    static std::vector<std::string> calls;
    return calls;
}

unsigned& TestCalls::registrationStatus() {
    static unsigned status = 0;
    return status;
}

TestRequest::TestRequest(SampleType type, std::string requestName) {
    name = std::move(requestName);
    sampleType = type;
}

TestRequest& TestRequest::raw(const std::string& column, int op, int dataType,
                              const std::string& bytes, int length) {
    // Readable bytes that are not part of the value follow it.
    Filter& filter = filters.emplace_back(Filter{column, bytes + std::string(16, ' '), {}});
    if (length == -32768) {
        length = static_cast<int>(bytes.size());
    }
    filter.info = {filter.column.c_str(), static_cast<_IntfOper>(op),
                   static_cast<std::int16_t>(dataType), static_cast<std::int16_t>(length),
                   filter.bytes.data()};
    return *this;
}

TestRequest& TestRequest::number(const std::string& column, int op, std::int64_t value) {
    std::string bytes(sizeof value, '\0');
    std::memcpy(bytes.data(), &value, sizeof value);
    return raw(column, op, SEL1_INTEGER, bytes);
}

TestRequest& TestRequest::text(const std::string& column, int op, const std::string& value) {
    return raw(column, op, 452, value);
}

class ctreq::Framework {
public:
    // Until it is reset, a walk over the conditions finds none.
    explicit Framework(RequestDetail* detail)
        : test(*static_cast<TestRequest*>(detail)), nextFilter(test.filters.size()) {}
    TestRequest& test;
    std::size_t nextFilter;
};

ctreq::ctreq(RequestDetail* detail, ContextInfo* /*context*/, TableManager* manager)
    : m_manager(manager), m_name(detail->name.c_str()), m_sampleType(detail->sampleType),
      m_interval(detail->interval), m_identifier(77), m_handle(++lastHandle),
      m_framework(std::make_unique<Framework>(detail)) {
    liveRequests()[m_handle] = this;
}

ctreq::~ctreq() {
    liveRequests().erase(m_handle);
    record(m_framework->test, "destroyed");
}

void ctreq::PrintSelf() {}
int ctreq::NumColumns() {
    return 0;
}
unsigned ctreq::GetColumnInfo(ColumnInfo* /*info*/, int /*index*/) {
    return 0;
}
unsigned ctreq::ExecuteCommand(char* /*command*/, int /*length*/, char* /*result*/) {
    return 0;
}
void ctreq::CommandCompleted(CtreqAutomationCapsule* /*capsule*/) {}
unsigned ctreq::ColumnIsException(char*, char*, _IntfOper, char*) {
    return 0;
}

unsigned ctreq::InsertRow(char* row) {
    TestRequest& test = m_framework->test;
    if (!test.insertStatus.empty()) {
        const unsigned status = test.insertStatus.front();
        test.insertStatus.pop_front();
        if (status != 0) {
            return status;
        }
    }
    if (count == allocated) {
        auto room = std::make_unique<char[]>(std::size_t{allocated + allocSize} * rowSize);
        std::copy_n(m_rows.get(), std::size_t{count} * rowSize, room.get());
        m_rows = std::move(room);
        allocated += allocSize;
    }
    std::memcpy(m_rows.get() + std::size_t{count} * rowSize, row, rowSize);
    ++count;
    return 0;
}

unsigned ctreq::CheckForException(char* row) {
    const TestRequest& test = m_framework->test;
    return !test.accepts || test.accepts(row) ? 1 : 0;
}

bool ctreq::MeetsConditions(char* row) {
    return CheckForException(row) != 0;
}

std::int64_t ctreq::EarlierPeriod() const {
    return m_framework->test.earlierPeriod;
}

void ctreq::CountEarlier(char* row) {
    m_framework->test.earlier.emplace_back(row, rowSize);
}

unsigned ctreq::GetFilterInfo(SEL1_FILTERINFO** filter) {
    TestRequest& test = m_framework->test;
    if (m_framework->nextFilter == test.filters.size()) {
        return 1;
    }
    ++test.fetched;
    *filter = &test.filters[m_framework->nextFilter++].info;
    return 0;
}

void ctreq::ResetFilterIndex() {
    m_framework->nextFilter = 0;
}

int ctreq::IsException(_IntfOper op, const char* column, const char* value, int width) {
    record(m_framework->test, "compare " + std::to_string(op) + " '" +
                                  std::string(column, static_cast<std::size_t>(width)) + "' with " +
                                  value);
    return m_framework->test.comparison;
}

int ctreq::IsException(_IntfOper op, int column, const char* value) {
    record(m_framework->test,
           "compare " + std::to_string(op) + " " + std::to_string(column) + " with " + value);
    return m_framework->test.comparison;
}

void ctreq::DumpThresholds() {
    TraceScope(anchor).always()("(thresholds)");
}

unsigned ctreq::Dispatch() {
    TestRequest& test = m_framework->test;
    // The lock of a table manager is held whenever rows are dispatched.
    if (pthread_mutex_trylock(&m_manager->lock()->mutex) == 0) {
        pthread_mutex_unlock(&m_manager->lock()->mutex);
        record(test, "dispatch without the lock");
    }
    record(test, "dispatch " + std::to_string(count));
    for (unsigned i = 0; i < count; ++i) {
        test.dispatched.emplace_back(rows() + std::size_t{i} * rowSize, rowSize);
    }
    return test.dispatchStatus;
}

unsigned ctreq::Stop() {
    record(m_framework->test, "stop");
    ++m_framework->test.stops;
    return 0;
}

unsigned ctreq::Stopped(unsigned reason) {
    record(m_framework->test, "stopped " + std::to_string(reason));
    m_framework->test.stopped.push_back(reason);
    return 0;
}

ctreq* ctreq::UseHandle(unsigned handle) {
    ctreq* const request = liveRequests().at(handle);
    record(request->m_framework->test, "pin");
    return request;
}

// The table managers of a framework that offers every row to every request.

class TableManager::Framework {};

TableManager::TableManager(const char* application, const char* table)
    : m_application(application), m_table(table) {}

TableManager::~TableManager() {
    Tables::remove(this);
}

unsigned TableManager::Shutdown(unsigned /*reason*/) {
    return 0;
}

LinkedList& TableManager::requestsFor(char* /*row*/, unsigned /*rowSize*/) {
    return m_requests;
}

unsigned TableManager::RegisterWithManager(TableManager* manager) {
    return TestCalls::registrationStatus() != 0 ? TestCalls::registrationStatus()
                                                : Tables::add(manager);
}

// By its linker name, since the handles are the double's.

extern "C" void __wrap__Z9RSC1_Dropj(unsigned handle);
extern "C" void __wrap__Z9RSC1_Dropj(unsigned handle) {
    TestCalls::all().push_back(std::string(liveRequests().at(handle)->name()) + " drop");
}
