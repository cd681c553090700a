#ifndef ZRM_HOST_SITUATION_JUDGE_H
#define ZRM_HOST_SITUATION_JUDGE_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>

namespace zrm::host {

class RowLayout;

/// How many groups and episodes a situation has now.
struct JudgeCounts {
    std::size_t episodes = 0; ///< that last
    std::size_t groups = 0;
    std::uint64_t droppedGroups = 0; ///< that made room for others since the situation was opened
};

/// Makes events of the rows that meet the conditions of one situation, or of their absence, while
/// the agent runs. Any thread; rows come on the threads of the logs.
class SituationJudge {
public:
    SituationJudge() = default;
    SituationJudge(const SituationJudge&) = delete;
    SituationJudge& operator=(const SituationJudge&) = delete;
    virtual ~SituationJudge() = default;

    /// Judges a row that meets the conditions. Returns the number of events that it has raised;
    /// none when the queue is closed.
    virtual std::optional<unsigned> judge(const RowLayout& layout, const char* row) = 0;

    /// Counts a row that an earlier run has judged.
    virtual void recount(const RowLayout& layout, const char* row) = 0;
    /// For how long before a log's position entries are counted again, in seconds.
    virtual std::int64_t earlierPeriod() const noexcept = 0;

    /// Raises and resolves what is due at this time: milliseconds since 1970, UTC. Returns the
    /// number of events that it has raised.
    virtual unsigned tick(std::int64_t now) = 0;

    /// Resolves every episode, since the situation ends.
    virtual void resolveAll(const std::string& reason) = 0;

    virtual JudgeCounts counts() const = 0;
};

} // namespace zrm::host

#endif
