#ifndef ZRM_HOST_SITUATION_SET_H
#define ZRM_HOST_SITUATION_SET_H

#include "host/base/Result.h"
#include "host/config/HostConfig.h"
#include "host/situations/Situation.h"
#include "host/situations/SituationRunner.h"
#include "host/situations/SituationStore.h"

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// A snapshot of a situation's state.
struct SituationStatus {
    enum class Source { FILE, API };
    enum class State { RUNNING, STOPPED, FAILED };
    using enum Source;
    using enum State;

    SituationConfig config;
    Source source = FILE;
    State state = RUNNING;
    std::string problem; ///< empty: none

    std::uint64_t offered = 0;   ///< entries offered to it
    std::uint64_t matched = 0;   ///< of these, those that met every condition
    std::uint64_t discarded = 0; ///< of these, those that the thresholds refused
    std::uint64_t raised = 0;
    std::int64_t lastRaised = 0; ///< milliseconds since 1970, UTC; 0: never
};

/// Why the situations were not changed.
struct SituationRefusal {
    enum class Reason {
        UNKNOWN,   ///< there is none of this name
        EXISTS,    ///< the name is taken
        FROM_FILE, ///< the situation belongs to the configuration file
        CHANGED,   ///< the situation is not the one that was to be changed
        TOO_MANY,
        NOT_SAVED, ///< the change could not be saved
        BUSY,      ///< other changes take too long
    };
    using enum Reason;
    Reason reason;
    Problem problem;
};

/// The situations by name: those of the configuration file and those created through the API. A
/// name may occur in both when it was added to the file later; then the file's runs, and the other
/// one counts as failed until the name is free. Any thread.
///
/// A change is saved before it is made, and takes effect before the call returns, with one
/// exception: opening and closing wait for log threads that wait for room in the event queue, and a
/// call waits at most `patience` for that. A stopped or removed situation raises nothing more
/// either way.
class SituationSet {
public:
    static constexpr std::size_t mostMade = 1000; ///< situations made through the API
    static constexpr std::chrono::seconds patience{3};

    using Change = Result<SituationStatus, SituationRefusal>;

    /// The table's manager and the queue outlive the object. An empty path: nothing is kept.
    SituationSet(TableManager& entries, EventQueue& queue, std::string storePath = "");
    SituationSet(const SituationSet&) = delete;
    SituationSet& operator=(const SituationSet&) = delete;

    /// Loads what was saved: the situations created through the API, and which ones are stopped.
    /// Returns a message for the operator, if there is one. Once, before the first apply.
    std::string load();

    /// Makes these the situations of the file. An unchanged one continues with the entry times that
    /// it has counted; a changed one starts over.
    void apply(const std::vector<SituationConfig>& configs);

    /// Waits until every situation that should run is open, at most until the limit; false when the
    /// time is up.
    bool waitUntilOpen(std::chrono::milliseconds limit) { return m_runner.settle(limit); }

    /// Those of the file first, then the others, each sorted by name.
    std::vector<SituationStatus> list() const;
    /// The one with this name that may run.
    std::optional<SituationStatus> find(const std::string& name) const;

    // Changes through the API.

    Change add(const SituationConfig& config);
    /// Replaces the one with this name, which starts over if the definition differs. If the caller
    /// names the version (SituationJson::version) that it knows, it must be the current one.
    Change replace(const SituationConfig& config,
                   const std::optional<std::string>& version = std::nullopt);
    Result<void, SituationRefusal> remove(const std::string& name);
    /// For situations of either source. Starting a failed one tries again.
    Change start(const std::string& name);
    Change stop(const std::string& name);

    /// Closes all of them for good. Waits for as long as log threads wait for room.
    void close() { m_runner.close(); }

    std::size_t size() const;

    /// How many groups and episodes all of them have now.
    JudgeCounts judgeCounts() const { return m_runner.judgeCounts(); }

private:
    using Key = std::pair<SituationStatus::Source, std::string>;
    static constexpr auto fileSource = SituationStatus::FILE;
    static constexpr auto apiSource = SituationStatus::API;

    struct Record {
        SituationConfig config;
        std::shared_ptr<SituationCounts> counts = std::make_shared<SituationCounts>();
        bool isStopped = false;
        std::string problem = {}; ///< why it cannot run; empty: it can
    };
    using Records = std::map<Key, Record>;
    /// The situations as they will be after a change.
    struct Draft {
        Records records;
        std::set<std::string> stoppedFiles;
    };
    using Changed = Result<Key, SituationRefusal>;

    class Turn;
    Changed change(const std::function<Changed(Draft&)>& plan);
    static Changed orTooLarge(const Records& records, const Key& key);
    Changed changeInTurn(const std::function<Changed(Draft&)>& plan);
    Result<void, SituationRefusal> save(const Draft& draft);
    void keepStoppedFiles();
    Change statusAfter(const Changed& changed) const;
    Change setStopped(const std::string& name, bool isStopped);
    static const Records::value_type* named(const Records& records, const std::string& name);
    static std::string runnerKey(const Key& key);

    // With m_mutex held.
    void publish(const Key& key, const Draft& draft);
    bool isShadowed(const Key& key) const;
    void run(const Key& key, const Record& record);
    void runAgain(const Key& key, const Record& record);
    SituationStatus statusOf(const Key& key, const Record& record) const;

    SituationStore m_store;              ///< used by the change whose turn it is
    std::set<std::string> m_keptStopped; ///< m_stoppedFiles as saved; used like m_store

    mutable std::mutex m_mutex; ///< guards what follows; held only briefly
    std::condition_variable m_turnEnded;
    bool m_isChanging =
        false; ///< a change through the API is in progress, until it is saved and published
    Records m_records;
    std::set<std::string> m_stoppedFiles; ///< names of the file's situations that are stopped

    SituationRunner m_runner; ///< guards itself
};

} // namespace zrm::host

#endif
