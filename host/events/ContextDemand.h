#ifndef ZRM_HOST_CONTEXT_DEMAND_H
#define ZRM_HOST_CONTEXT_DEMAND_H

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// How many earlier entries the events of open situations are to have, by log. Any thread.
class ContextDemand {
public:
    /// While it exists, the events of a log are to have this many; none: those of every log.
    class Hold {
    public:
        Hold(std::optional<std::string> log, std::size_t entries);
        ~Hold();
        Hold(const Hold&) = delete;
        Hold& operator=(const Hold&) = delete;

    private:
        const std::optional<std::string> m_log;
        const std::size_t m_entries;
    };

    /// The most that any of them wants of this log.
    static std::size_t of(std::string_view log);

    /// Changes when the demand does. Costs one read of memory that is rarely written.
    static std::uint64_t generation() noexcept {
        return m_generation.load(std::memory_order_acquire);
    }

private:
    static inline constinit std::atomic<std::uint64_t> m_generation{1};
};

} // namespace zrm::host

#endif
