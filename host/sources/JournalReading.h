#ifndef ZRM_HOST_JOURNAL_READING_H
#define ZRM_HOST_JOURNAL_READING_H

#include "host/base/RetryPause.h"
#include "host/sources/Journal.h"
#include "host/sources/JournalFiles.h"
#include "host/sources/JournalJoin.h"

#include <chrono>
#include <cstdint>
#include <deque>
#include <optional>
#include <set>
#include <string>
#include <sys/types.h>
#include <utility>
#include <vector>

namespace zrm::host {

/// Reads a journal as it grows, each entry once, through rotation and the removal of old files.
class JournalReading final : public EntrySource::Reading {
public:
    /// Call it on the thread that reads. `messages` as for Journal; `join`: which entries of the
    /// journal make one; null: each is one.
    explicit JournalReading(const JournalConfig& config,
                            std::shared_ptr<const MessageFormat> messages = nullptr,
                            std::shared_ptr<const LineJoin> join = nullptr);

    void startAt(Start start) override;
    void resumeAt(const std::string& position) override;
    void recall(const std::string& position, std::chrono::seconds period) override;
    char* next() override;
    std::string position() override;
    std::string takeBack() override;
    void wait(std::chrono::milliseconds most) override;
    const std::string& problem() const noexcept override { return m_problem; }
    std::optional<EntrySource::Remark> takeRemark() override;

    bool read(EntryColumns& columns) override;
    std::string_view text() const noexcept override { return m_journal.message(); }
    bool isTextCut() const noexcept override { return m_journal.isMessageCut(); }
    void readFields(EntryFields& fields) override { m_journal.readFields(fields); }

private:
    using Clock = std::chrono::steady_clock;

    bool open();
    char* nextLine();
    void notePosition();
    int seek();
    int seekEnd();
    int seekPosition();
    void noteLoss();
    void noteDamage();
    void remark(EntrySource::Remark remark);
    void lookAtFiles();
    bool hasNewDirectory();
    void fail(std::string problem);

    const JournalConfig m_config;
    Journal m_journal;
    const std::shared_ptr<const LineJoin> m_rules;
    std::optional<JournalJoin> m_join; ///< none: nothing is joined
    /// Of the last entry that was read, or before all; empty: at the end.
    std::string m_position;
    bool m_wasAbsent = false;          ///< there was no journal at an earlier look
    std::optional<std::string> m_last; ///< the entry after which recall ends
    std::uint64_t m_recallFrom = 0;    ///< microseconds since 1970-01-01 UTC
    bool m_isRecalled = false;
    bool m_isPassing = false; ///< next has returned null although there may be more

    std::string m_problem;
    std::deque<EntrySource::Remark> m_remarks;
    std::uint64_t m_damaged = 0;      ///< entries, as remarked last
    std::uint64_t m_faults;           ///< of the thread, as remarked last
    std::set<std::string> m_files;    ///< those that were examined
    std::vector<ino_t> m_directories; ///< 0: not there
    RetryPause m_pause;
    Clock::time_point m_retry{};
    Clock::time_point m_look{}; ///< at the directories
};

} // namespace zrm::host

#endif
