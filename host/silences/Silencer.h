#ifndef ZRM_HOST_SILENCER_H
#define ZRM_HOST_SILENCER_H

#include "host/silences/Silence.h"
#include "host/silences/Wildcard.h"

#include <cstddef>
#include <cstdint>
#include <functional>
#include <span>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

namespace zrm::host {

class Silences;
struct Event;

/// What silences look at in an event.
struct SilenceSubject {
    std::string_view situation;
    std::string_view severity;
    std::string_view log;
    std::span<const GroupValue> group = {};
    std::int64_t raised = 0; ///< milliseconds since 1970, UTC
};

/// Finds the silence that holds an event back. Costs next to nothing while nothing is silenced. For
/// one thread at a time.
class Silencer {
public:
    /// The silence of a stored event; 0: none, or the event is not stored.
    using Stored = std::function<std::uint64_t(std::uint64_t event)>;

    /// `silences` must outlive the object. `node` is the agent's. `stored` may be null.
    Silencer(const Silences& silences, std::string node, Stored stored = nullptr);

    /// The silence of an event of this log; 0: none. The end of an episode is as silent as its
    /// beginning.
    std::uint64_t of(const Event& event, std::string_view log);

    /// Of the silences that match, the oldest; 0: none does.
    std::uint64_t find(const SilenceSubject& event);

private:
    /// A silence with its patterns.
    struct Active {
        explicit Active(const Silence& silence);

        std::uint64_t id;
        std::int64_t end;
        Wildcard situation;
        Wildcard log;
        Wildcard severity;
        Wildcard node;
        std::vector<std::pair<std::string, Wildcard>> group;
    };
    using Candidates = std::vector<const Active*>;

    void refresh();
    std::uint64_t ofBeginning(std::uint64_t episode);
    bool isOfThisNode(const Wildcard& pattern) const;
    const Candidates& candidates(const SilenceSubject& event);
    static bool isOfGroup(const Active& silence, const SilenceSubject& event);

    const Silences& m_silences;
    const std::string m_node;
    const Stored m_stored;
    std::uint64_t m_version = 0;
    std::vector<Active> m_active;
    std::int64_t m_end = 0; ///< of the last one
    /// Those that match whatever the group is, by situation, severity and log.
    std::unordered_map<std::string, Candidates> m_candidates;
    std::size_t m_remembered = 0; ///< in m_candidates
    std::string m_key;
    /// The silences of this run's open episodes, by the episode's id.
    std::unordered_map<std::uint64_t, std::uint64_t> m_episodes;
};

} // namespace zrm::host

#endif
