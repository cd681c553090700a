#include "base/EntryFields.h"
#include "base/TraceScope.h"
#include "framework/EventRoom.h"
#include "framework/LogEntry.h"
#include "framework/traceSilence.h"
#include "logs/FollowSettings.h"
#include "monitor/EarlierEntries.h"
#include "monitor/FileFollower.h"
#include "monitor/LogFile.h"

namespace zrm {

// Counts entries of a followed log again that an earlier run has judged.

namespace {

TRC1_Anchor anchor{"LogFileRecount.cpp"};

/// The entry that is counted, for conditions on its fields.
class EarlierEntry final : public LogEntry {
public:
    EarlierEntry(const LogFile& log, bool hasText) : m_log(log), m_hasText(hasText) {}

    void begin(std::string_view text) noexcept {
        m_text = text;
        m_hasFields = false;
    }
    std::string_view text() const override { return m_hasText ? m_text : std::string_view(); }
    bool isCut() const override { return false; }
    const EntryFields& fields() override {
        if (!m_hasFields) {
            m_fields.clear();
            m_log.readFields(m_text, m_fields);
            m_hasFields = true;
        }
        return m_fields;
    }
    const EntryKeep& keep() const override { return m_log.followSettings()->keep; }

private:
    const LogFile& m_log;
    const bool m_hasText;    ///< false: a record
    std::string_view m_text; ///< or the record
    EntryFields m_fields;
    bool m_hasFields = false;
};

} // namespace

std::int64_t LogFile::earlierPeriod() {
    TraceScope trace(anchor);
    if (m_earlierReceiver.count == nullptr) {
        return trace.result(std::int64_t{0});
    }
    if (EventRoom::now() == EventRoom::State::HELD) {
        // The situations are still being opened.
        EventRoom::wait([this] { return monitorStatus() == MONITOR_RUNNING; });
    }
    m_pulse.work("counts earlier entries again");
    zrm_rmlogent_data_t* const row = ownRow();
    const EntryRow withoutEntry(*this, row);
    return trace.result(m_earlierReceiver.period(*row));
}

void LogFile::countEarlier(zrm_rmlogent_data_t& row) {
    const EntryInstant instant(m_clock.next(lastEntryMoment, row.entrytime));
    m_earlierReceiver.count(row);
}

/// Counts the entries just before the position again, for the thresholds of situations.
void LogFile::recount(FileFollower& follower, std::size_t recordLength) {
    TraceScope trace(anchor);
    const auto place = follower.place();
    const std::int64_t period = place ? earlierPeriod() : 0;
    if (period == 0) {
        return;
    }
    EarlierEntries earlier(fileNameLocal(), followSettings()->rotatedTo, recordLength,
                           followSettings()->join.value.get());
    if (const auto position = follower.position()) {
        earlier.leaveOutLate(position->late);
    }
    zrm_rmlogent_data_t* const row = ownRow();
    EarlierEntry current(*this, recordLength == 0);
    const LogEntry::Offer offer(current);
    {
        const TRC1_Silence silence; // the earlier run has traced it
        earlier.read(
            place->file, place->offset, period,
            [&](char* entry, std::string_view text) {
                current.begin(text);
                return formatEntryAsRow(entry, row, nullptr) == 0
                           ? m_clock.rangeOf(lastEntryMoment, row->entrytime)
                           : std::nullopt;
            },
            [&](char* entry, std::string_view text) {
                current.begin(text);
                if (formatEntryAsRow(entry, row, nullptr) == 0) {
                    countEarlier(*row);
                }
                return monitorStatus() == MONITOR_RUNNING;
            });
    }
    if (monitorStatus() != MONITOR_RUNNING) {
        return; // interrupted
    }
    for (const std::string& file : earlier.unread()) {
        trace.error()("Entries of %s in %s are not counted again for thresholds: the file is "
                      "damaged, or too large to be checked in time.",
                      fileNameLocal(), file.c_str());
    }
}

} // namespace zrm
