#include "host/situations/SituationSet.h"

#include "base/TraceScope.h"
#include "host/config/ConditionBuilder.h"

#include <algorithm>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SituationSet.cpp"};

} // namespace

SituationSet::SituationSet(TableManager& entries, EventQueue& queue, std::string storePath)
    : m_store(std::move(storePath)), m_runner(entries, queue) {}

/// The key under which the runner has a situation.
std::string SituationSet::runnerKey(const Key& key) {
    return (key.first == fileSource ? "file " : "API ") + key.second;
}

std::string SituationSet::load() {
    TraceScope trace(anchor);
    SituationStore::Content content = m_store.load();
    const std::lock_guard guard(m_mutex);
    for (SituationStore::Made& made : content.made) {
        const Key key{apiSource, made.config.name};
        Record& record = m_records[key];
        record.config = std::move(made.config);
        record.isStopped = made.isStopped;
        record.problem = std::move(made.problem);
    }
    m_stoppedFiles.insert(content.stoppedFiles.begin(), content.stoppedFiles.end());
    m_keptStopped = m_stoppedFiles;
    return content.message;
}

void SituationSet::apply(const std::vector<SituationConfig>& configs) {
    TraceScope trace(anchor);
    {
        const std::lock_guard guard(m_mutex);
        std::set<std::string> names;
        for (const SituationConfig& config : configs) {
            names.insert(config.name);
        }
        for (auto record = m_records.begin(); record != m_records.end();) {
            const auto& [source, name] = record->first;
            if (source == fileSource && !names.contains(name)) {
                m_runner.stop(runnerKey(record->first));
                record = m_records.erase(record);
            } else {
                ++record;
            }
        }
        std::erase_if(m_stoppedFiles,
                      [&](const std::string& name) { return !names.contains(name); });
        for (const SituationConfig& config : configs) {
            const Key key{fileSource, config.name};
            const auto found = m_records.find(key);
            if (found == m_records.end() || found->second.config != config) {
                Record record{config};
                record.isStopped = m_stoppedFiles.contains(config.name);
                m_records.insert_or_assign(key, record);
                run(key, record);
            }
        }
        // Names that were added to or removed from the file decide what is shadowed.
        for (const auto& [key, record] : m_records) {
            if (key.first == apiSource) {
                runAgain(key, record);
            }
        }
    }
    m_runner.settle(patience);
    keepStoppedFiles();
}

std::vector<SituationStatus> SituationSet::list() const {
    const std::lock_guard guard(m_mutex);
    std::vector<SituationStatus> all;
    all.reserve(m_records.size());
    for (const auto& [key, record] : m_records) {
        all.push_back(statusOf(key, record));
    }
    return all;
}

std::optional<SituationStatus> SituationSet::find(const std::string& name) const {
    const std::lock_guard guard(m_mutex);
    const auto* const found = named(m_records, name);
    return found == nullptr ? std::nullopt : std::optional(statusOf(found->first, found->second));
}

/// The one that a name means in the API: the file's situation hides one created through it.
const SituationSet::Records::value_type* SituationSet::named(const Records& records,
                                                             const std::string& name) {
    for (const auto source : {fileSource, apiSource}) {
        const auto found = records.find({source, name});
        if (found != records.end()) {
            return &*found;
        }
    }
    return nullptr;
}

bool SituationSet::isShadowed(const Key& key) const {
    return key.first == apiSource && m_records.contains({fileSource, key.second});
}

/// Starts or stops a record that is new or has changed.
void SituationSet::run(const Key& key, const Record& record) {
    const std::string name = runnerKey(key);
    if (record.isStopped || !record.problem.empty() || isShadowed(key)) {
        m_runner.stop(name);
    } else {
        m_runner.start(name, record.config, record.counts);
    }
}

/// The same for one that may be running, which it then continues to do.
void SituationSet::runAgain(const Key& key, const Record& record) {
    const SituationRunner::State state = m_runner.state(runnerKey(key));
    const bool isUp =
        state == SituationRunner::State::OPEN || state == SituationRunner::State::OPENING;
    const bool isToRun = !record.isStopped && record.problem.empty() && !isShadowed(key);
    if (isUp != isToRun) {
        run(key, record);
    }
}

SituationStatus SituationSet::statusOf(const Key& key, const Record& record) const {
    SituationStatus status;
    status.config = record.config;
    status.source = key.first;
    // Read in this order, the counts agree although log threads keep counting.
    status.lastRaised = record.counts->lastRaised();
    status.raised = record.counts->raised();
    status.matched = std::max(record.counts->requests.matched(), status.raised);
    status.offered = std::max(record.counts->requests.judged(), status.matched);
    status.discarded = status.matched - status.raised;
    const auto fail = [&](std::string problem) {
        status.state = SituationStatus::FAILED;
        status.problem = std::move(problem);
    };
    if (isShadowed(key)) {
        fail("the configuration file has a situation of this name, which runs in its place: "
             "remove or rename one of them");
    } else if (!record.problem.empty()) {
        fail(record.problem);
    } else if (record.isStopped) {
        status.state = SituationStatus::STOPPED;
    } else {
        switch (m_runner.state(runnerKey(key))) {
        case SituationRunner::State::REFUSED:
            fail("the agent's Log Entries table opened no request: start it again");
            break;
        case SituationRunner::State::ENDED:
            fail("the agent has stopped it, since its entry times cannot be counted: start it "
                 "again");
            break;
        case SituationRunner::State::OPENING:
            status.problem =
                "has not been opened yet: a log is waiting for room in the event queue";
            break;
        case SituationRunner::State::ABSENT: // the agent is stopping
        case SituationRunner::State::OPEN:
            break;
        }
    }
    return status;
}

std::size_t SituationSet::size() const {
    const std::lock_guard guard(m_mutex);
    return m_records.size();
}

} // namespace zrm::host
