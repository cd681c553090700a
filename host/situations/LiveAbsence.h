#ifndef ZRM_HOST_LIVE_ABSENCE_H
#define ZRM_HOST_LIVE_ABSENCE_H

#include "host/config/HostConfig.h"
#include "host/events/EventQueue.h"
#include "host/events/PositionBook.h"
#include "host/situations/AbsenceJudge.h"
#include "host/situations/JudgedValues.h"
#include "host/situations/SituationJudge.h"
#include "host/situations/TextRenderer.h"

#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// Raises an event when no entry has met the conditions of a situation for too long, and resolves
/// it with the next one. Silences are measured in watched time (ExpectedGroups), and nothing is
/// raised before the logs have been read beyond the moment at which it was due. Any thread.
class LiveAbsence : public SituationJudge {
public:
    /// Continues with what an earlier run has left. The queue outlives the object.
    LiveAbsence(const SituationConfig& config, std::shared_ptr<const SituationLabel> label,
                EventQueue& queue);
    /// What is still to be stored is handed over.
    ~LiveAbsence() override;

    std::optional<unsigned> judge(const RowLayout& layout, const char* row) override;
    /// Entries of before the position have been seen.
    void recount(const RowLayout&, const char*) override {}
    std::int64_t earlierPeriod() const noexcept override { return 0; }
    unsigned tick(std::int64_t now) override;
    void resolveAll(const std::string& reason) override;
    JudgeCounts counts() const override;

private:
    using Group = AbsenceJudge::Group;

    void restore();
    std::vector<Group> storedGroups(std::int64_t watched);
    void noteSource(Group& group, const RowLayout& layout, const char* row);
    bool isReadUntil(std::int64_t due, std::int64_t now);
    bool raise(Group& group, std::int64_t watched, std::int64_t now);
    bool resolve(const Group& group, std::shared_ptr<EpisodeId> absence, const std::string& reason);
    bool push(const std::shared_ptr<EventJudgement>& judgement);
    void resolveDropped();
    void note(const Group& group);
    void noteSeen(std::int64_t watched);

    const SituationConfig m_config;
    const std::shared_ptr<const SituationLabel> m_label;
    EventQueue& m_queue;
    const std::shared_ptr<PositionBook> m_book;
    const TextRenderer m_texts;
    const std::int64_t m_noteEvery; ///< milliseconds
    const std::int64_t m_opened;    ///< watched time

    mutable std::mutex m_mutex; ///< guards what follows
    AbsenceJudge m_judge;
    JudgedValues m_values;
    std::string m_log; ///< of the current entry
    std::string m_utf8;
    std::vector<Group> m_dropped;
    /// What is due is raised when the logs have been read until then.
    struct Due {
        std::int64_t watched;
        std::int64_t time; ///< the same by the clock: milliseconds since 1970
    };
    std::optional<Due> m_due;
    std::int64_t m_noted;   ///< what was seen until then is noted: watched time
    std::uint64_t m_losses; ///< of the store
};

} // namespace zrm::host

#endif
