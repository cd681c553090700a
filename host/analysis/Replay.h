#ifndef ZRM_HOST_REPLAY_H
#define ZRM_HOST_REPLAY_H

#include "host/config/HostConfig.h"
#include "host/framework/RowLayout.h"

#include <cstdint>
#include <memory>
#include <optional>

class TableManager;

namespace zrm {
struct zrm_rmlogent_data_t;
} // namespace zrm

namespace zrm::host {

/// Judges entries as a situation would, without being one: a request of the agent's own, which no
/// log offers anything to and which raises nothing. Conditions and thresholds are judged by the
/// very code that monitors. Of a log of the log configuration, the period in which entries are
/// counted ends at the time of the newest entry and not now, as if each entry had been read when it
/// was written. While an EntryInstant exists, an entry is one of a followed log. One thread.
class Replay {
public:
    struct Verdict {
        bool matches = false;          ///< every condition holds
        bool isRaised = false;         ///< and the thresholds let it pass
        std::optional<long> frequency; ///< entries counted in the period; none without thresholds
    };

    /// The table's manager outlives the object.
    Replay(const SituationConfig& situation, TableManager& entries);
    ~Replay();
    Replay(const Replay&) = delete;
    Replay& operator=(const Replay&) = delete;

    /// Whether the table has given a request; nothing else may be called without.
    bool isOpen() const noexcept { return m_request != nullptr; }
    /// The columns of the rows.
    const RowLayout& layout() const { return *m_layout; }

    /// Both thresholds are in force.
    bool hasThresholds() const noexcept;
    /// N: at least N entries in the period; -N: at most N.
    std::int64_t frequency() const noexcept;
    std::int64_t periodSeconds() const noexcept;

    /// Whether every condition holds; counts nothing. Writes the row's threshold columns.
    bool matches(zrm_rmlogent_data_t& row);
    /// The next entry, counted when every condition holds. Writes the row's threshold columns.
    Verdict judge(zrm_rmlogent_data_t& row);
    /// The next entry, of which it is known that every condition holds: its ENTRYTIME.
    Verdict count(const char* entryTime);

private:
    class Request;
    struct Surroundings;
    Verdict take();

    std::unique_ptr<Surroundings> m_surroundings;
    std::unique_ptr<Request> m_request;
    std::optional<RowLayout> m_layout;
};

} // namespace zrm::host

#endif
