#ifndef ZRM_HOST_SITUATION_H
#define ZRM_HOST_SITUATION_H

#include "host/config/HostConfig.h"
#include "host/events/ContextDemand.h"
#include "host/events/EventQueue.h"
#include "host/framework/Request.h"
#include "host/framework/RowLayout.h"
#include "host/situations/EntryValue.h"
#include "host/situations/SituationJudge.h"
#include "host/situations/TextRenderer.h"

#include <atomic>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

class TableManager;

namespace zrm::host {

/// What a situation has done so far. Outlives the situation's requests, so that counting continues
/// when it is stopped and started. Log threads count, one at a time; any thread reads, without a
/// lock.
class SituationCounts {
public:
    /// Entries offered to its requests, and those that met its conditions.
    RequestCounts requests;

    std::uint64_t raised() const noexcept { return m_raised.load(std::memory_order_relaxed); }
    /// Milliseconds since 1970, UTC; 0: never.
    std::int64_t lastRaised() const noexcept {
        return m_lastRaised.load(std::memory_order_relaxed);
    }

    void countRaised(std::uint64_t count, std::int64_t now) noexcept {
        m_raised.store(raised() + count, std::memory_order_relaxed);
        m_lastRaised.store(now, std::memory_order_relaxed);
    }

private:
    std::atomic<std::uint64_t> m_raised{0};
    std::atomic<std::int64_t> m_lastRaised{0};
};

/// One running situation: an open request on Log Entries whose rows become events. Opened and
/// closed by one thread; rows arrive on the threads of the logs.
class Situation : private RowReceiver {
public:
    /// Opens the situation on the table. The table's manager and the queue must outlive the object.
    Situation(SituationConfig config, TableManager& entries, EventQueue& queue,
              std::shared_ptr<SituationCounts> counts);
    Situation(const Situation&) = delete;
    Situation& operator=(const Situation&) = delete;

    bool isOpen() const noexcept { return m_request && m_request->isOpen(); }
    const std::string& name() const noexcept { return m_config.name; }

    /// Why the agent has stopped it (a reason of ctreq::Stopped); 0 if it has not. Any thread.
    unsigned stopReason() const noexcept { return m_stopReason.load(); }

    /// Raises nothing from now on, although the situation is still open. Unlike closing, this does
    /// not wait. Any thread.
    void silence();

    /// No more rows come. Waits until no other thread works on one. By the thread that opened it.
    void close() { m_request.reset(); }

    /// Raises and resolves what is due at this time: milliseconds since 1970, UTC. One thread at a
    /// time.
    void tick(std::int64_t now);
    /// Resolves every episode. Any thread.
    void resolveAll(const std::string& reason);
    /// Whether the situation has groups, episodes, pauses or absences.
    bool isJudged() const noexcept { return m_judge != nullptr; }
    JudgeCounts judgeCounts() const { return isJudged() ? m_judge->counts() : JudgeCounts(); }

private:
    std::int64_t earlierPeriod() const override;
    void receiveEarlier(const ctreq& request, const char* row) override;
    const RowLayout& layoutOf(const ctreq& request);
    unsigned receive(const ctreq& request, const char* rows, unsigned count) override;
    void stopped(const ctreq& request, unsigned reason) override;
    std::shared_ptr<const EventJudgement> judgementOf(const ctreq& request, const char* row);
    TextFacts factsOf(const char* row, std::string& log) const;

    const SituationConfig m_config;
    const std::shared_ptr<const SituationLabel> m_label;
    EventQueue& m_queue;
    const std::shared_ptr<SituationCounts> m_counts;
    std::atomic<unsigned> m_stopReason{0};
    const ContextDemand::Hold m_context;
    const TextRenderer m_texts;
    // Used under the table manager's lock.
    EntryReading m_reading;
    const std::unique_ptr<SituationJudge> m_judge; ///< null: the table's thresholds decide
    std::once_flag m_isLaidOut;
    std::optional<RowLayout> m_layout; ///< of the rows
    std::optional<Request> m_request;  ///< last member: rows may arrive during its construction
};

} // namespace zrm::host

#endif
