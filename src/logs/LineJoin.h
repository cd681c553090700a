#ifndef ZRM_LINE_JOIN_H
#define ZRM_LINE_JOIN_H

#include <chrono>
#include <cstddef>
#include <string>
#include <string_view>

namespace zrm {

/// Which lines of a followed log make one entry. Not changed after it was made: shared by all
/// threads without a lock.
class LineJoin {
public:
    /// An entry that reaches one of these ends there; the next line begins an entry.
    struct Limits {
        std::size_t lines = 1000;
        std::size_t bytes = 64 * 1024; ///< with line ends
        /// How long an entry at the end of the file waits for further lines.
        std::chrono::milliseconds wait{2000};
    };

    explicit LineJoin(const Limits& limits) : m_limits(limits) {}
    LineJoin(const LineJoin&) = delete;
    LineJoin& operator=(const LineJoin&) = delete;
    virtual ~LineJoin() = default;

    /// Whether a line belongs to the entry of the line before it. Both without line ends. Any
    /// thread. Reports ask in the reverse order of the lines, so the answer depends on nothing
    /// else.
    virtual bool continues(std::string_view before, std::string_view line) const = 0;
    const Limits& limits() const noexcept { return m_limits; }
    /// All that decides which lines are joined, as a text: joins with equal texts are the same.
    virtual const std::string& definition() const noexcept = 0;

private:
    const Limits m_limits;
};

} // namespace zrm

#endif
