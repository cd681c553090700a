#ifndef ZRM_HOST_SILENCES_H
#define ZRM_HOST_SILENCES_H

#include "host/base/Result.h"
#include "host/silences/Silence.h"

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <vector>

namespace zrm::host {

/// Why a silence was not created or expired.
struct SilenceRefusal {
    enum class Reason {
        UNKNOWN, ///< there is none with this id
        OVER,    ///< it has expired already
        TOO_MANY,
        NOT_KEPT, ///< the change could not be stored
    };
    using enum Reason;
    Reason reason;
    Problem problem;
};

/// Events that a silence has held back.
struct SilencedEvents {
    std::uint64_t silence = 0;
    std::uint64_t events = 0;
    std::int64_t last = 0; ///< when the latest was raised: milliseconds since 1970, UTC
};

/// What the history has of silences.
struct KeptSilences {
    std::vector<Silence> silences;
    std::uint64_t lastId = 0; ///< the largest id ever given
};

/// The silences, also those that have expired, until they are removed. A change is stored before it
/// is made. Any thread.
class Silences {
public:
    static constexpr std::size_t mostActive = 10'000;
    static constexpr std::size_t mostExpired = 10'000; ///< more are removed, the oldest first

    using Change = Result<Silence, SilenceRefusal>;
    /// Stores a new or changed silence, without its count.
    using Store = std::function<Result<void>(const Silence&)>;

    explicit Silences(KeptSilences kept = {});
    Silences(const Silences&) = delete;
    Silences& operator=(const Silences&) = delete;

    /// From now on changes are stored. Without this, silences end with the process. Before any
    /// change.
    void storeWith(Store store) { m_store = std::move(store); }
    bool areKept() const noexcept { return m_store != nullptr; }

    /// Creates a silence; its id is given here. Silencers know it before this returns.
    Change add(Silence silence);

    /// Ends a silence at `now`, which `who` (may be empty) has asked for.
    Change expire(std::uint64_t id, const std::string& who, std::int64_t now);

    /// All of them, the newest first.
    std::vector<Silence> list() const;
    std::optional<Silence> find(std::uint64_t id) const;

    /// Increases with every change of what is silenced.
    std::uint64_t version() const noexcept { return m_version.load(std::memory_order_acquire); }

    /// Those that are active at a time, by id.
    std::vector<Silence> active(std::int64_t now) const;

    std::size_t activeCount(std::int64_t now) const;
    /// Events that silences have held back since the start.
    std::uint64_t heldBack() const noexcept { return m_heldBack.load(std::memory_order_relaxed); }

    // For whoever stores them.

    /// Counts events that are stored.
    void count(const std::vector<SilencedEvents>& events);
    /// True if so many have expired that the oldest should be removed.
    bool areTooManyExpired() const;
    /// Removes those that were over before `time` (milliseconds since 1970), and those that are too
    /// many. Returns their ids.
    std::vector<std::uint64_t> removeExpired(std::int64_t time);

private:
    std::size_t countActive(std::int64_t now) const;

    Store m_store;
    std::atomic<std::uint64_t> m_version{1};
    std::atomic<std::uint64_t> m_heldBack{0};

    mutable std::mutex m_mutex; ///< guards what follows; not held while something is stored
    std::map<std::uint64_t, Silence> m_silences;
    std::set<std::uint64_t> m_expiring; ///< somebody is about to end these
    std::uint64_t m_lastId = 0;
};

} // namespace zrm::host

#endif
