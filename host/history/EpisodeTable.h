#ifndef ZRM_HOST_EPISODE_TABLE_H
#define ZRM_HOST_EPISODE_TABLE_H

#include "host/events/Episode.h"
#include "host/events/Event.h"
#include "host/history/Acknowledgements.h"
#include "host/history/Statement.h"

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace zrm::host {

/// What an event says about an episode or a pause, as it is to be stored with the event.
struct EpisodeChange {
    std::uint64_t event = 0;
    std::int64_t raised = 0; ///< of the event: milliseconds since 1970, UTC
    std::string log;         ///< of the event
    std::string node;        ///< of the event, as rows have it in ORIGINNODE
    std::shared_ptr<const SituationLabel> situation;
    std::shared_ptr<const EventJudgement> judgement;
};

/// Episodes as stored in the history: what identifies one, what each log has added to it, and how
/// it ended. Used by the writer's thread. Throws DatabaseError.
class EpisodeTable {
public:
    explicit EpisodeTable(Database& database);

    /// Begins or ends an episode, or a pause.
    void keep(const EpisodeChange& change);
    void keep(const EpisodeShare& share);

    AcknowledgementChange acknowledge(std::uint64_t episode, const Acknowledgement& by);
    AcknowledgementChange withdraw(std::uint64_t episode);

    /// Removes what has ended of the events up to this id.
    void removeUntil(std::uint64_t id);

    /// The episodes and pauses that last.
    static std::vector<StoredEpisode> open(Database& database);

private:
    AcknowledgementChange whyNot(std::uint64_t episode);

    Statement m_begin;
    Statement m_end;
    Statement m_endPause;
    Statement m_share;
    Statement m_acknowledge;
    Statement m_withdraw;
    Statement m_find;
    Statement m_remove;
    Statement m_removeShares;
};

} // namespace zrm::host

#endif
