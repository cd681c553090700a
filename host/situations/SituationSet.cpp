#include "host/situations/SituationSet.h"

#include "base/TraceScope.h"
#include "host/config/ConditionBuilder.h"

#include <algorithm>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SituationSet.cpp"};

constexpr auto fileSource = SituationStatus::FILE;
constexpr auto apiSource = SituationStatus::API;

tl::unexpected<SituationRefusal> refuse(SituationRefusal::Reason reason, std::string what,
                                        std::string field = "") {
    return tl::unexpected(SituationRefusal{reason, {std::move(what), "", std::move(field)}});
}

tl::unexpected<SituationRefusal> unknown(const std::string& name) {
    return refuse(SituationRefusal::UNKNOWN, "there is no situation '" + name + "'", "name");
}

tl::unexpected<SituationRefusal> fromFile(const std::string& name) {
    return refuse(SituationRefusal::FROM_FILE,
                  "the situation '" + name +
                      "' belongs to the configuration file: change it there, which takes effect at "
                      "once, or stop it",
                  "name");
}

tl::unexpected<SituationRefusal> missing(bool isInFile, const std::string& name) {
    return isInFile ? fromFile(name) : unknown(name);
}

/// The key under which the runner has a situation.
std::string runnerKey(SituationStatus::Source source, const std::string& name) {
    return (source == fileSource ? "file " : "API ") + name;
}

} // namespace

/// The time in which one change of the API keeps the others waiting.
class SituationSet::Turn {
public:
    explicit Turn(SituationSet& set) : m_set(set) {
        std::unique_lock lock(m_set.m_mutex);
        m_hasCome =
            m_set.m_turnEnded.wait_for(lock, patience, [this] { return !m_set.m_isChanging; });
        m_set.m_isChanging = true;
    }
    ~Turn() {
        if (m_hasCome) {
            const std::lock_guard guard(m_set.m_mutex);
            m_set.m_isChanging = false;
            m_set.m_turnEnded.notify_one();
        }
    }
    Turn(const Turn&) = delete;
    Turn& operator=(const Turn&) = delete;
    bool hasCome() const noexcept { return m_hasCome; }

private:
    SituationSet& m_set;
    bool m_hasCome = false;
};

SituationSet::SituationSet(TableManager& entries, EventQueue& queue, std::string storePath)
    : m_store(std::move(storePath)), m_runner(entries, queue) {}

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
                m_runner.stop(runnerKey(source, name));
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
        // What the file has come to name, or names no more, shadows others or does not.
        for (const auto& [key, record] : m_records) {
            if (key.first == apiSource) {
                runAgain(key, record);
            }
        }
    }
    m_runner.settle(patience);
    keepStoppedFiles();
}

/// What the file names no more is forgotten for good: not only until the next start.
void SituationSet::keepStoppedFiles() {
    TraceScope trace(anchor);
    const Turn turn(*this);
    if (!turn.hasCome()) {
        return; // the change after those that are under way saves it
    }
    Draft draft;
    {
        const std::lock_guard guard(m_mutex);
        draft = {m_records, m_stoppedFiles};
    }
    if (draft.stoppedFiles != m_keptStopped) {
        save(draft);
    }
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

/// The key, unless the regular expressions of what was made through the API have become too large.
SituationSet::Changed SituationSet::orTooLarge(const Records& records, const Key& key) {
    PatternBudget budget(PatternBudget::ofSource);
    for (const auto& [one, record] : records) {
        if (one.first == apiSource) {
            budget.spend(record.config.patternSize);
        }
    }
    if (!budget.isExceeded()) {
        return key;
    }
    return refuse(SituationRefusal::TOO_MANY,
                  "the regular expressions of the situations created through the API are too large "
                  "together: remove a situation, or write smaller ones");
}

SituationSet::Change SituationSet::add(const SituationConfig& config) {
    return statusAfter(change([&](Draft& draft) -> Changed {
        if (named(draft.records, config.name) != nullptr) {
            return refuse(SituationRefusal::EXISTS,
                          "there is a situation '" + config.name +
                              "' already: choose another name, or change that one",
                          "name");
        }
        const auto made =
            std::count_if(draft.records.begin(), draft.records.end(),
                          [](const auto& one) { return one.first.first == apiSource; });
        if (static_cast<std::size_t>(made) >= mostMade) {
            return refuse(SituationRefusal::TOO_MANY,
                          "there are " + std::to_string(mostMade) +
                              " situations created through the API: remove one first");
        }
        const Key key{apiSource, config.name};
        draft.records.emplace(key, Record{config});
        return orTooLarge(draft.records, key);
    }));
}

SituationSet::Change SituationSet::replace(const SituationConfig& config) {
    return statusAfter(change([&](Draft& draft) -> Changed {
        const Key key{apiSource, config.name};
        const auto found = draft.records.find(key);
        if (found == draft.records.end()) {
            return missing(named(draft.records, config.name) != nullptr, config.name);
        }
        Record& record = found->second;
        if (record.config != config || !record.problem.empty()) {
            Record exchanged{config};
            exchanged.isStopped = record.isStopped;
            record = std::move(exchanged);
        }
        return orTooLarge(draft.records, key);
    }));
}

Result<void, SituationRefusal> SituationSet::remove(const std::string& name) {
    const Changed changed = change([&](Draft& draft) -> Changed {
        const Key key{apiSource, name};
        if (draft.records.erase(key) == 0) {
            return missing(named(draft.records, name) != nullptr, name);
        }
        return key;
    });
    return changed.map([](const Key&) {});
}

SituationSet::Change SituationSet::start(const std::string& name) {
    return setStopped(name, false);
}

SituationSet::Change SituationSet::stop(const std::string& name) {
    return setStopped(name, true);
}

SituationSet::Change SituationSet::setStopped(const std::string& name, bool isStopped) {
    return statusAfter(change([&](Draft& draft) -> Changed {
        const auto* const found = named(draft.records, name);
        if (found == nullptr) {
            return unknown(name);
        }
        const Key key = found->first;
        draft.records[key].isStopped = isStopped;
        if (key.first == fileSource && isStopped) {
            draft.stoppedFiles.insert(name);
        } else if (key.first == fileSource) {
            draft.stoppedFiles.erase(name);
        }
        return key;
    }));
}

/// Makes the change that `plan` makes to the draft, of the record whose key it returns.
SituationSet::Changed SituationSet::change(const std::function<Changed(Draft&)>& plan) {
    TraceScope trace(anchor);
    Changed changed = changeInTurn(plan);
    if (changed) {
        m_runner.settle(patience);
    }
    return changed;
}

SituationSet::Changed SituationSet::changeInTurn(const std::function<Changed(Draft&)>& plan) {
    TraceScope trace(anchor);
    const Turn turn(*this);
    if (!turn.hasCome()) {
        return refuse(SituationRefusal::BUSY,
                      "other changes of the situations are in progress: try again");
    }
    Draft draft;
    {
        const std::lock_guard guard(m_mutex);
        draft = {m_records, m_stoppedFiles};
    }
    Changed changed = plan(draft);
    if (!changed) {
        return changed;
    }
    if (const auto saved = save(draft); !saved) {
        return tl::unexpected(saved.error());
    }
    const std::lock_guard guard(m_mutex);
    publish(*changed, draft);
    return changed;
}

/// Takes one record over from the draft. The file's may have changed since it was made.
void SituationSet::publish(const Key& key, const Draft& draft) {
    const auto drafted = draft.records.find(key);
    const auto found = m_records.find(key);
    if (drafted == draft.records.end()) {
        m_records.erase(key);
        m_runner.stop(runnerKey(key.first, key.second));
        return;
    }
    if (key.first == fileSource) {
        if (found != m_records.end()) {
            if (drafted->second.isStopped) {
                m_stoppedFiles.insert(key.second);
            } else {
                m_stoppedFiles.erase(key.second);
            }
            found->second.isStopped = drafted->second.isStopped;
            runAgain(key, found->second);
        }
        return;
    }
    const bool isAsItWas =
        found != m_records.end() && found->second.counts == drafted->second.counts;
    const Record& record = m_records.insert_or_assign(key, drafted->second).first->second;
    if (isAsItWas) {
        runAgain(key, record);
    } else {
        run(key, record);
    }
}

SituationSet::Change SituationSet::statusAfter(const Changed& changed) const {
    if (!changed) {
        return tl::unexpected(changed.error());
    }
    const std::lock_guard guard(m_mutex);
    const auto found = m_records.find(*changed);
    if (found == m_records.end()) {
        return unknown(changed->second); // gone again, or the file has lost it
    }
    return statusOf(found->first, found->second);
}

/// The one that a name stands for in the API: the file's situation hides one made through it.
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

/// Lets a record that is new or has changed run, or not.
void SituationSet::run(const Key& key, const Record& record) {
    const std::string name = runnerKey(key.first, key.second);
    if (record.isStopped || !record.problem.empty() || isShadowed(key)) {
        m_runner.stop(name);
    } else {
        m_runner.start(name, record.config, record.counts);
    }
}

/// The same for one that may run already, and then goes on undisturbed.
void SituationSet::runAgain(const Key& key, const Record& record) {
    const SituationRunner::State state = m_runner.state(runnerKey(key.first, key.second));
    const bool isUp =
        state == SituationRunner::State::OPEN || state == SituationRunner::State::OPENING;
    const bool isToRun = !record.isStopped && record.problem.empty() && !isShadowed(key);
    if (isUp != isToRun) {
        run(key, record);
    }
}

Result<void, SituationRefusal> SituationSet::save(const Draft& draft) {
    SituationStore::Content content;
    for (const auto& [key, record] : draft.records) {
        if (key.first == apiSource) {
            content.made.push_back({record.config, record.isStopped});
        }
    }
    content.stoppedFiles.assign(draft.stoppedFiles.begin(), draft.stoppedFiles.end());
    if (const Result<void> saved = m_store.save(content); !saved) {
        return refuse(SituationRefusal::NOT_SAVED,
                      "the change cannot be saved and was not made: " + saved.error().text());
    }
    m_keptStopped = draft.stoppedFiles;
    return {};
}

SituationStatus SituationSet::statusOf(const Key& key, const Record& record) const {
    SituationStatus status;
    status.config = record.config;
    status.source = key.first;
    // In this order the counts agree although log threads go on counting.
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
        switch (m_runner.state(runnerKey(key.first, key.second))) {
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
