#include "host/situations/Situation.h"

#include "base/TraceScope.h"
#include "framework/LogEntry.h"
#include "framework/ctreq.h"
#include "host/base/JsonWriter.h"
#include "host/base/TimeText.h"
#include "host/events/RowText.h"
#include "host/framework/Status.h"
#include "host/situations/LiveAbsence.h"
#include "host/situations/LiveJudge.h"

#include <algorithm>
#include <chrono>
#include <map>
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

std::string labelsText(const std::map<std::string, std::string>& labels) {
    return labels.empty() ? std::string() : JsonWriter::text([&](JsonWriter& json) {
        json.beginObject();
        for (const auto& [name, value] : labels) {
            json.member(name, value);
        }
        json.endObject();
    });
}

std::shared_ptr<const SituationLabel> labelOf(const SituationConfig& config) {
    SituationLabel label{config.name, config.severity, config.text};
    label.fields = fieldsOf(config.conditions);
    label.context = config.context;
    label.runbook = config.runbook;
    label.labels = labelsText(config.labels);
    label.definition = LiveJudge::definitionOf(config);
    return std::make_shared<const SituationLabel>(std::move(label));
}

/// Null if the table's thresholds decide.
std::unique_ptr<SituationJudge> judgeOf(const SituationConfig& config,
                                        const std::shared_ptr<const SituationLabel>& label,
                                        EventQueue& queue) {
    if (config.judgement.absent > 0) {
        return std::make_unique<LiveAbsence>(config, label, queue);
    }
    if (!config.judgement.isUsed()) {
        return nullptr;
    }
    return std::make_unique<LiveJudge>(config, label, queue);
}

} // namespace

Situation::Situation(SituationConfig config, TableManager& entries, EventQueue& queue,
                     std::shared_ptr<SituationCounts> counts)
    : m_config(std::move(config)), m_label(labelOf(m_config)), m_queue(queue),
      m_counts(std::move(counts)), m_context(m_config.log, m_config.context), m_texts(m_config),
      m_judge(judgeOf(m_config, m_label, queue)),
      m_request(std::in_place, entries, detailOf(m_config), static_cast<RowReceiver&>(*this),
                &m_counts->requests) {
    TraceScope trace(anchor);
    if (!isOpen()) {
        trace.error()("Situation %s could not be opened.", m_config.name.c_str());
    }
}

void Situation::silence() {
    TraceScope trace(anchor);
    if (isOpen()) {
        m_request->get()->Stop();
    }
}

unsigned Situation::receive(const ctreq& request, const char* rows, unsigned count) {
    TraceScope trace(anchor);
    if (m_judge != nullptr) {
        unsigned raised = 0;
        for (unsigned index = 0; index < count; ++index) {
            const auto events =
                m_judge->judge(layoutOf(request), rows + std::size_t{index} * request.rowSize);
            if (!events) {
                return trace.result(static_cast<unsigned>(Status::end));
            }
            raised += *events;
        }
        if (raised > 0) {
            m_counts->countRaised(raised, WallClock::now());
        }
        return trace.result(0u);
    }
    // Before waiting for room: the events count as raised, whenever they are delivered.
    m_counts->countRaised(count, WallClock::now());
    for (unsigned index = 0; index < count; ++index) {
        const char* const row = rows + std::size_t{index} * request.rowSize;
        if (!m_queue.push(m_label, row, judgementOf(request, row))) {
            return trace.result(static_cast<unsigned>(Status::end));
        }
    }
    return trace.result(0u);
}

/// Null where there is nothing to say beyond what the conditions decided.
std::shared_ptr<const EventJudgement> Situation::judgementOf(const ctreq& request,
                                                             const char* row) {
    if (!m_texts.isNeeded()) {
        return nullptr;
    }
    m_reading.begin(layoutOf(request), row, LogEntry::ofThisThread);
    auto judgement = std::make_shared<EventJudgement>();
    std::string log;
    judgement->text = m_texts.text(m_reading, factsOf(row, log));
    return judgement;
}

/// What a situation without groups and episodes counts: the entries that reached its threshold, up
/// to this one. `log` has the room for the log's name.
TextFacts Situation::factsOf(const char* row, std::string& log) const {
    TextFacts facts;
    log = LogPath::of(*m_layout, row);
    facts.log = log;
    if (const RowColumn* const count = m_layout->find("FREQTHRESH")) {
        facts.count = static_cast<std::uint64_t>(std::max(count->integer(row), 1));
    }
    if (const RowColumn* const time = m_layout->find("ENTRYTIME")) {
        facts.first = facts.last = TimeText::toMilliseconds(time->text(row)).value_or(0);
    }
    return facts;
}

/// What rows look like is known when the first one comes.
const RowLayout& Situation::layoutOf(const ctreq& request) {
    std::call_once(m_isLaidOut, [&] { m_layout.emplace(const_cast<ctreq&>(request)); });
    return *m_layout;
}

std::int64_t Situation::earlierPeriod() const {
    return m_judge == nullptr ? 0 : m_judge->earlierPeriod();
}

void Situation::receiveEarlier(const ctreq& request, const char* row) {
    if (m_judge != nullptr) {
        m_judge->recount(layoutOf(request), row);
    }
}

void Situation::tick(std::int64_t now) {
    // Rows of a situation that raises something here raise nothing, so that nobody else counts.
    if (const unsigned raised = m_judge == nullptr ? 0 : m_judge->tick(now); raised > 0) {
        m_counts->countRaised(raised, now);
    }
}

void Situation::resolveAll(const std::string& reason) {
    if (m_judge != nullptr) {
        m_judge->resolveAll(reason);
    }
}

void Situation::stopped(const ctreq& /*request*/, unsigned reason) {
    TraceScope trace(anchor);
    m_stopReason = reason;
    trace.error()("The agent has stopped situation %s; reason = %u.", m_config.name.c_str(),
                  reason);
}

} // namespace zrm::host
