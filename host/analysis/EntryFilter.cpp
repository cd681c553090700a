#include "host/analysis/EntryFilter.h"

#include "host/framework/Request.h"
#include "tables/zrm_rmlogent_base.h"

#include <new>
#include <utility>

namespace zrm::host {

namespace {

/// Never called: nothing is dispatched.
class NoReceiver : public RowReceiver {
public:
    unsigned receive(const ctreq&, const char*, unsigned) override { return 0; }
    void stopped(const ctreq&, unsigned) override {}
};

} // namespace

struct EntryFilter::Surroundings {
    explicit Surroundings(std::vector<Condition> conditions) {
        detail.name = "filter";
        detail.sampleType = SAMPLE_SITUATION;
        detail.conditions = std::move(conditions);
    }

    RequestDetail detail;
    NoReceiver receiver;
    ContextInfo context{receiver};
};

class EntryFilter::Request : public zrm_rmlogent_base {
public:
    using zrm_rmlogent_base::zrm_rmlogent_base;

    void TakeSample() override {}
    unsigned InsertRow(char* /*row*/) override {
        isMet = true;
        return 0;
    }

    bool isMet = false;
};

EntryFilter::EntryFilter(std::vector<Condition> conditions, TableManager& entries)
    : m_surroundings(std::make_unique<Surroundings>(std::move(conditions))) {
    m_request.reset(new (std::nothrow)
                        Request(&m_surroundings->detail, &m_surroundings->context, &entries));
    if (m_request != nullptr && m_request->handle() == 0) {
        m_request.reset(); // the limit of requests is reached
    }
    if (m_request != nullptr) {
        m_layout.emplace(*m_request);
    }
}

EntryFilter::~EntryFilter() = default;

bool EntryFilter::meets(zrm_rmlogent_data_t& row) {
    m_request->isMet = false;
    m_request->AddData(&row, 1);
    return m_request->isMet;
}

} // namespace zrm::host
