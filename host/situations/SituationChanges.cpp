// The changes of the situations through the API.
#include "base/TraceScope.h"
#include "host/config/ConditionBuilder.h"
#include "host/situations/SituationJson.h"
#include "host/situations/SituationSet.h"

#include <algorithm>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SituationChanges.cpp"};

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

tl::unexpected<SituationRefusal> changedMeanwhile(const std::string& name) {
    return refuse(SituationRefusal::CHANGED,
                  "somebody has changed the situation '" + name +
                      "' since you read it: read it again, and repeat your change",
                  "version");
}

tl::unexpected<SituationRefusal> missing(bool isInFile, const std::string& name) {
    return isInFile ? fromFile(name) : unknown(name);
}

} // namespace

/// While it exists, one change through the API keeps the others waiting.
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

/// The key, unless the regular expressions of the situations created through the API are too large.
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

SituationSet::Change SituationSet::replace(const SituationConfig& config,
                                           const std::optional<std::string>& version) {
    return statusAfter(change([&](Draft& draft) -> Changed {
        const Key key{apiSource, config.name};
        const auto found = draft.records.find(key);
        if (found == draft.records.end()) {
            return missing(named(draft.records, config.name) != nullptr, config.name);
        }
        Record& record = found->second;
        if (version && *version != SituationJson::version(record.config)) {
            return changedMeanwhile(config.name);
        }
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

/// Makes the change that `plan` makes to the draft, to the record whose key it returns.
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

/// Stores which situations of the file are stopped, without those that have left the file.
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

/// Publishes one record of the draft. The file's situations may have changed since the draft was
/// made.
void SituationSet::publish(const Key& key, const Draft& draft) {
    const auto drafted = draft.records.find(key);
    const auto found = m_records.find(key);
    if (drafted == draft.records.end()) {
        m_records.erase(key);
        m_runner.stop(runnerKey(key));
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

} // namespace zrm::host
