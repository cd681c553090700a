#include "host/sources/JournalSource.h"

#include "base/ErrorText.h"
#include "framework/cancellation.h"
#include "host/base/JsonWriter.h"
#include "host/sources/Journal.h"
#include "host/sources/JournalFiles.h"
#include "host/sources/JournalJoin.h"
#include "host/sources/JournalJoinBack.h"
#include "host/sources/JournalReading.h"
#include "host/sources/MapFaults.h"

#include <algorithm>
#include <limits>
#include <utility>

namespace zrm::host {

namespace {

/// Reads a journal backwards for a report.
class JournalPast final : public EntrySource::Past {
public:
    JournalPast(const JournalConfig& config, std::shared_ptr<const MessageFormat> messages)
        : m_directory(config.directory), m_journal(config, std::move(messages)) {}

    bool begin(std::int64_t newest) override {
        m_newest = std::max<std::int64_t>(newest, 0); // nothing is older
        m_faults = MapFaults::count();
        m_problem = JournalFiles::look(m_directory).problem();
        if (!m_problem.empty()) {
            return false;
        }
        int outcome = m_journal.open();
        // Behind the last entry of that time: the library goes on from there.
        outcome =
            outcome < 0 ? outcome : m_journal.seekTime(static_cast<std::uint64_t>(m_newest) + 1);
        return check(outcome);
    }
    char* previous() override {
        Journal::Step step = m_journal.previous();
        while (isPassing(step) || (step == Journal::Step::entry && time() > m_newest)) {
            step = m_journal.previous();
        }
        return give(step);
    }
    bool turn() override {
        // The journal is at that entry, or at an older one that is not wanted.
        return turnAt(m_journal.cursor());
    }
    bool turnAt(const std::string& at) { return !at.empty() && check(m_journal.seekCursor(at)); }
    char* next() override {
        Journal::Step step = m_journal.next();
        while (isPassing(step)) {
            step = m_journal.next();
        }
        return give(step);
    }
    std::int64_t time() const noexcept override {
        return static_cast<std::int64_t>(m_journal.time());
    }
    const std::string& problem() const noexcept override { return m_problem; }
    Journal& journal() noexcept { return m_journal; }

    bool read(EntryColumns& columns) override {
        m_journal.read(columns);
        return true;
    }
    std::string_view text() const noexcept override { return m_journal.message(); }
    bool isTextCut() const noexcept override { return m_journal.isMessageCut(); }
    void readFields(EntryFields& fields) override { m_journal.readFields(fields); }

private:
    static bool isPassing(Journal::Step step) noexcept {
        return step == Journal::Step::passing && !CTX1_IsCancelled();
    }
    char* give(Journal::Step step) {
        if (step == Journal::Step::failed) {
            check(m_journal.error());
        } else if (m_journal.damaged() > 0 || MapFaults::count() > m_faults) {
            m_problem = "a file of the journal is damaged";
        }
        return step == Journal::Step::entry ? m_journal.text() : nullptr;
    }
    bool check(int outcome) {
        if (outcome < 0) {
            m_problem = std::string("the journal cannot be read: ") + ErrorText(-outcome).text();
        }
        return outcome >= 0;
    }

    const std::string m_directory;
    Journal m_journal;
    std::int64_t m_newest = 0;
    std::uint64_t m_faults = 0; ///< of the thread, when the reading began
    std::string m_problem;
};

/// Reads a journal backwards and joins its entries.
class JoinedPast final : public EntrySource::Past {
public:
    JoinedPast(const JournalConfig& config, std::shared_ptr<const MessageFormat> messages,
               std::shared_ptr<const LineJoin> rules)
        : m_lines(config, std::move(messages)), m_rules(std::move(rules)), m_back(*m_rules),
          m_forward(*m_rules) {}

    bool begin(std::int64_t newest) override {
        // An entry may have lines that are younger than its first one.
        const std::int64_t wait = m_rules->limits().wait.count() * 1000;
        m_newest = newest;
        return m_lines.begin(std::min(newest, std::numeric_limits<std::int64_t>::max() - wait) +
                             wait);
    }
    char* previous() override {
        for (bool isOver = false;;) {
            const JournalEntry* const entry = m_back.previous(isOver);
            if (entry != nullptr && static_cast<std::int64_t>(entry->first.time) > m_newest) {
                continue;
            }
            if (entry != nullptr) {
                m_given = entry->first.cursor;
                return show(*entry);
            }
            if (isOver) {
                return nullptr;
            }
            if (m_lines.previous() != nullptr) {
                m_back.add(m_lines.journal().line());
            } else if (isOver = true; CTX1_IsCancelled()) {
                return nullptr;
            }
        }
    }
    bool turn() override {
        m_forward.passOver(m_back.waiting());
        return m_lines.turnAt(m_given);
    }
    char* next() override {
        for (bool isOver = false;;) {
            if (const JournalEntry* const entry =
                    m_forward.next(JournalJoin::Clock::now(), isOver)) {
                return show(*entry);
            }
            if (isOver) {
                return nullptr;
            }
            if (m_lines.next() != nullptr) {
                m_forward.add(m_lines.journal().line(), JournalJoin::Clock::now());
            } else {
                isOver = true;
            }
        }
    }
    std::int64_t time() const noexcept override { return m_lines.time(); }
    const std::string& problem() const noexcept override { return m_lines.problem(); }
    bool read(EntryColumns& columns) override { return m_lines.read(columns); }
    std::string_view text() const noexcept override { return m_lines.text(); }
    bool isTextCut() const noexcept override { return m_lines.isTextCut(); }
    void readFields(EntryFields& fields) override { m_lines.readFields(fields); }

private:
    char* show(const JournalEntry& entry) {
        m_lines.journal().show(entry);
        return m_lines.journal().text();
    }

    JournalPast m_lines;
    const std::shared_ptr<const LineJoin> m_rules;
    JournalJoinBack m_back;
    JournalJoin m_forward;
    std::int64_t m_newest = 0;
    std::string m_given; ///< cursor of the first line of the entry that was given last
};

std::string definitionOf(const JournalConfig& config, const Defined<MessageFormat>& messages,
                         const Defined<LineJoin>& join) {
    return JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().member("journal", config.directory).member("units", config.units);
        json.member("identifiers", config.identifiers).member("priority", config.priority);
        json.member("boot", config.isCurrentBoot);
        json.member("messages", messages ? messages->definition() : std::string());
        json.member("join", join ? join->definition() : std::string()).endObject();
    });
}

} // namespace

JournalSource::JournalSource(JournalConfig config, Defined<MessageFormat> messages,
                             Defined<LineJoin> join)
    : m_config(std::move(config)), m_messages(std::move(messages)), m_join(std::move(join)),
      m_definition(definitionOf(m_config, m_messages, m_join)) {}

std::unique_ptr<EntrySource::Reading> JournalSource::reading() const {
    return std::make_unique<JournalReading>(m_config, m_messages.value, m_join.value);
}

std::unique_ptr<EntrySource::Past> JournalSource::past() const {
    if (m_join) {
        return std::make_unique<JoinedPast>(m_config, m_messages.value, m_join.value);
    }
    return std::make_unique<JournalPast>(m_config, m_messages.value);
}

} // namespace zrm::host
