#ifndef ZRM_HOST_ABSENCE_JUDGE_H
#define ZRM_HOST_ABSENCE_JUDGE_H

#include "host/events/Episode.h"

#include <cstddef>
#include <cstdint>
#include <list>
#include <memory>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

namespace zrm::host {

/// Decides which groups have had no entry for too long. Knows times and groups alone, so that live
/// monitoring and backtests find the same; times are in any unit, and never decrease. One thread at
/// a time.
class AbsenceJudge {
public:
    /// A group from which entries are expected.
    struct Group {
        std::string key;
        std::int64_t seen = 0; ///< when its last entry came, or when waiting for it began
        std::shared_ptr<EpisodeId> absence = nullptr; ///< null: it is not absent

        // For the caller, who knows the clock and the log; the judge does not look at them.
        std::int64_t since = 0; ///< the same as `seen` by the clock, in seconds since 1970
        std::string log = {};   ///< full path of the log that its last entry came from
        std::string node = {};  ///< as the rows have it in ORIGINNODE
    };

    /// A group is absent `limit` after its last entry. At most so many groups are kept: the one
    /// that has had no entry for longest makes room.
    AbsenceJudge(std::int64_t limit, std::size_t mostGroups);

    /// An entry of the group has come; a group that is new is expected from now on. Its absence is
    /// over: the caller takes it out of the group. Groups that made room are added to `dropped`.
    Group& came(std::string_view key, std::int64_t time, std::vector<Group>& dropped);

    /// Expects a group that there is not yet, as it is. Of several, those seen first come first.
    void expect(Group group, std::vector<Group>& dropped);

    /// The earliest time at which a group becomes absent; the largest number if none does.
    std::int64_t nextDue() const noexcept;
    /// A group that is due at this time; it counts as absent from now on, and the caller sets its
    /// absence. Null when there are no more.
    Group* takeDue(std::int64_t time);

    /// The groups that are not absent, the one seen last first.
    const std::list<Group>& present() const noexcept { return m_present; }
    const std::list<Group>& absent() const noexcept { return m_absent; }

    std::size_t groups() const noexcept { return m_byKey.size(); }
    /// Groups that made room for others.
    std::uint64_t droppedGroups() const noexcept { return m_dropped; }

private:
    struct Place {
        std::list<Group>::iterator at;
        bool isAbsent = false;
    };
    void makeRoom(std::vector<Group>& dropped);

    const std::int64_t m_limit;
    const std::size_t m_most;
    std::list<Group> m_present; ///< the one seen last first
    std::list<Group> m_absent;  ///< the one that became absent last first
    std::unordered_map<std::string_view, Place> m_byKey;
    std::uint64_t m_dropped = 0;
};

} // namespace zrm::host

#endif
