#ifndef ZRM_HOST_LIVE_JUDGE_H
#define ZRM_HOST_LIVE_JUDGE_H

#include "host/config/HostConfig.h"
#include "host/events/EventQueue.h"
#include "host/framework/RowLayout.h"
#include "host/situations/EpisodeJudge.h"
#include "host/situations/JudgedValues.h"
#include "host/situations/SituationJudge.h"
#include "host/situations/TextRenderer.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Judges the groups and episodes of one situation while the agent runs.
class LiveJudge : public SituationJudge {
public:
    /// Continues with the episodes that an earlier run has left. The queue outlives the object.
    LiveJudge(const SituationConfig& config, std::shared_ptr<const SituationLabel> label,
              EventQueue& queue);

    std::optional<unsigned> judge(const RowLayout& layout, const char* row) override;
    void recount(const RowLayout& layout, const char* row) override;
    std::int64_t earlierPeriod() const noexcept override { return m_config.judgement.period; }
    unsigned tick(std::int64_t now) override;
    void resolveAll(const std::string& reason) override;
    JudgeCounts counts() const override;

    /// A hash of what decides when episodes begin and end.
    static std::int64_t definitionOf(const SituationConfig& config);

    /// Resolves an episode of a situation that does not run any more.
    static void resolve(EventQueue& queue, const StoredEpisode& episode, const std::string& reason);

private:
    EpisodeJudge::Entry entryOf(const RowLayout& layout, const char* row);
    void continueWith(const StoredEpisode& stored);
    bool push(const char* row, const EpisodeJudge::Entry& entry,
              const EpisodeJudge::Verdict& verdict);
    bool pushResolved(const std::string& reason = "");
    bool isOver(Episode& episode, std::int64_t now, std::int64_t judgedUntil) const;
    bool mayBeFollowed(const Episode& episode, std::int64_t now) const;
    void noteShares();

    const SituationConfig m_config;
    const std::shared_ptr<const SituationLabel> m_label;
    EventQueue& m_queue;
    const TextRenderer m_texts;
    const std::int64_t m_opened; ///< milliseconds since 1970, UTC

    mutable std::mutex m_mutex; ///< guards what follows
    EpisodeJudge m_judge;
    JudgedValues m_values;
    std::string m_log; ///< of the current entry
    std::string m_utf8;
    std::vector<EndedEpisode> m_ended;
    std::vector<std::shared_ptr<GrowingShare>> m_shares; ///< of logs without positions
    std::int64_t m_nextLook = 0; ///< at every episode, whatever their times say
};

} // namespace zrm::host

#endif
