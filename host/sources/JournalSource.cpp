#include "host/sources/JournalSource.h"

#include "base/ErrorText.h"
#include "framework/cancellation.h"
#include "host/base/JsonWriter.h"
#include "host/sources/Journal.h"
#include "host/sources/JournalFiles.h"
#include "host/sources/JournalReading.h"
#include "host/sources/MapFaults.h"

#include <algorithm>
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
        const std::string at = m_journal.cursor();
        return !at.empty() && check(m_journal.seekCursor(at));
    }
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

std::string definitionOf(const JournalConfig& config, const Defined<MessageFormat>& messages) {
    return JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().member("journal", config.directory).member("units", config.units);
        json.member("identifiers", config.identifiers).member("priority", config.priority);
        json.member("boot", config.isCurrentBoot);
        json.member("messages", messages ? messages->definition() : std::string()).endObject();
    });
}

} // namespace

JournalSource::JournalSource(JournalConfig config, Defined<MessageFormat> messages)
    : m_config(std::move(config)), m_messages(std::move(messages)),
      m_definition(definitionOf(m_config, m_messages)) {}

std::unique_ptr<EntrySource::Reading> JournalSource::reading() const {
    return std::make_unique<JournalReading>(m_config, m_messages.value);
}

std::unique_ptr<EntrySource::Past> JournalSource::past() const {
    return std::make_unique<JournalPast>(m_config, m_messages.value);
}

} // namespace zrm::host
