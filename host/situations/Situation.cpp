#include "host/situations/Situation.h"

#include "base/TraceScope.h"
#include "framework/ctreq.h"
#include "host/base/TimeText.h"
#include "host/framework/Status.h"

#include <algorithm>
#include <chrono>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"Situation.cpp"};

/// The fields that the conditions name, each once.
std::vector<std::string> fieldsOf(const std::vector<Condition>& conditions) {
    std::vector<std::string> fields;
    for (const Condition& condition : conditions) {
        const auto field = fieldOf(condition.column);
        if (field && std::find(fields.begin(), fields.end(), *field) == fields.end()) {
            fields.emplace_back(*field);
        }
    }
    return fields;
}

RequestDetail detailOf(const SituationConfig& config) {
    RequestDetail detail;
    detail.name = config.name;
    detail.sampleType = SAMPLE_SITUATION;
    detail.conditions = config.conditions;
    return detail;
}

} // namespace

Situation::Situation(SituationConfig config, TableManager& entries, EventQueue& queue,
                     std::shared_ptr<SituationCounts> counts)
    : m_config(std::move(config)), m_label(std::make_shared<const SituationLabel>(SituationLabel{
                                       m_config.name, m_config.severity, m_config.text,
                                       fieldsOf(m_config.conditions), m_config.context})),
      m_queue(queue), m_counts(std::move(counts)), m_context(m_config.log, m_config.context),
      m_request(entries, detailOf(m_config), *this, &m_counts->requests) {
    TraceScope trace(anchor);
    if (!isOpen()) {
        trace.error()("Situation %s could not be opened.", m_config.name.c_str());
    }
}

void Situation::silence() {
    TraceScope trace(anchor);
    if (isOpen()) {
        m_request.get()->Stop();
    }
}

unsigned Situation::receive(const ctreq& request, const char* rows, unsigned count) {
    TraceScope trace(anchor);
    // Before waiting for room: the events count as raised, whenever they are delivered.
    m_counts->countRaised(count, WallClock::now());
    for (unsigned index = 0; index < count; ++index) {
        if (!m_queue.push(m_label, rows + std::size_t{index} * request.rowSize)) {
            return trace.result(static_cast<unsigned>(Status::end));
        }
    }
    return trace.result(0u);
}

void Situation::stopped(const ctreq& /*request*/, unsigned reason) {
    TraceScope trace(anchor);
    m_stopReason = reason;
    trace.error()("The agent has stopped situation %s; reason = %u.", m_config.name.c_str(),
                  reason);
}

} // namespace zrm::host
