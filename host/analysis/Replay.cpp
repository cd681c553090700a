#include "host/analysis/Replay.h"

#include "base/TraceScope.h"
#include "host/framework/Request.h"
#include "tables/zrm_rmlogent_agent.h"

#include <cstring>
#include <new>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"Replay.cpp"};

/// Never called: nothing is dispatched.
class NoReceiver : public RowReceiver {
public:
    unsigned receive(const ctreq&, const char*, unsigned) override { return 0; }
    void stopped(const ctreq&, unsigned) override {}
};

} // namespace

struct Replay::Surroundings {
    explicit Surroundings(const SituationConfig& situation) {
        detail.name = situation.name;
        detail.sampleType = SAMPLE_SITUATION;
        detail.conditions = situation.conditions;
    }

    RequestDetail detail;
    NoReceiver receiver;
    ContextInfo context{receiver};
};

class Replay::Request : public zrm_rmlogent_agent {
public:
    using zrm_rmlogent_agent::zrm_rmlogent_agent;

    unsigned InsertRow(char* row) override {
        matched = true;
        return isCounting ? zrm_rmlogent_agent::InsertRow(row) : 0;
    }
    const _RequestThresholds& inForce() const noexcept { return thresholdsInForce(); }

    bool isCounting = false;
    bool matched = false;
    std::optional<long> frequency;

protected:
    long countEvents(Timestamp& newest, long period) override {
        frequency = newest.countEvents(period, newest.eventTime());
        return *frequency;
    }
    long countFollowed(std::int64_t instant) override {
        frequency = zrm_rmlogent_agent::countFollowed(instant);
        return *frequency;
    }
};

Replay::Replay(const SituationConfig& situation, TableManager& entries)
    : m_surroundings(std::make_unique<Surroundings>(situation)) {
    TraceScope trace(anchor);
    m_request.reset(new (std::nothrow)
                        Request(&m_surroundings->detail, &m_surroundings->context, &entries));
    if (m_request != nullptr && m_request->handle() == 0) {
        m_request.reset(); // the limit of requests is reached
    }
    if (m_request != nullptr) {
        m_request->TakeSampleConstructor();
        m_layout.emplace(*m_request);
    }
}

Replay::~Replay() = default;

bool Replay::hasThresholds() const noexcept {
    return frequency() != 0 && periodSeconds() != 0;
}

std::int64_t Replay::frequency() const noexcept {
    return m_request->inForce().freqThreshold;
}

std::int64_t Replay::periodSeconds() const noexcept {
    return m_request->inForce().periodThreshold;
}

bool Replay::matches(zrm_rmlogent_data_t& row) {
    m_request->isCounting = false;
    m_request->matched = false;
    m_request->AddData(&row, 1);
    return m_request->matched;
}

Replay::Verdict Replay::judge(zrm_rmlogent_data_t& row) {
    m_request->isCounting = true;
    m_request->matched = false;
    m_request->frequency.reset();
    m_request->AddData(&row, 1);
    return take();
}

Replay::Verdict Replay::count(const char* entryTime) {
    zrm_rmlogent_data_t row{};
    std::memcpy(row.entrytime, entryTime, sizeof row.entrytime);
    m_request->isCounting = true;
    m_request->frequency.reset();
    m_request->InsertRow(reinterpret_cast<char*>(&row));
    return take();
}

Replay::Verdict Replay::take() {
    const Verdict verdict{m_request->matched, m_request->count > 0, m_request->frequency};
    m_request->count = 0;
    return verdict;
}

} // namespace zrm::host
