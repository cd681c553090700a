#ifndef ZRM_LINE_JOIN_H
#define ZRM_LINE_JOIN_H

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <string>
#include <string_view>

namespace zrm {

/// Which lines of a followed log make one entry. Not changed after it was made: shared by all
/// threads without a lock.
class LineJoin {
public:
    static constexpr std::size_t mostBytes = 64 * 1024; ///< of an entry of several lines

    /// An entry ends before a line with which it would have more than this. A longer line is an
    /// entry of its own.
    struct Limits {
        std::size_t lines = 1000;
        std::size_t bytes = mostBytes; ///< with line ends; at most mostBytes
        /// How long an entry at the end of the file waits for further lines.
        std::chrono::milliseconds wait{2000};
    };

    explicit LineJoin(const Limits& limits) noexcept
        : m_limits{limits.lines, std::min(limits.bytes, mostBytes), limits.wait} {}
    LineJoin(const LineJoin&) = delete;
    LineJoin& operator=(const LineJoin&) = delete;
    virtual ~LineJoin() = default;

    /// Whether a line belongs to the entry of the line before it, as far as the limits allow. Both
    /// without newlines. No line that begins with a NUL byte does: a writer that does not append
    /// leaves NUL bytes where a truncation has removed lines.
    bool joins(std::string_view before, std::string_view line) const {
        return !line.starts_with('\0') && continues(withoutReturn(before), withoutReturn(line));
    }
    /// Whether a line without its newline may be continued. If not, it need not wait for others.
    bool isOpen(std::string_view line) const { return mayBeContinued(withoutReturn(line)); }
    const Limits& limits() const noexcept { return m_limits; }
    /// All that decides which lines are joined, as a text: joins with equal texts are the same.
    virtual const std::string& definition() const noexcept = 0;

protected:
    /// Whether a line continues the one before it. Both without line ends. Any thread. Reports ask
    /// in the reverse order of the lines, so the answer depends on nothing else.
    virtual bool continues(std::string_view before, std::string_view line) const = 0;
    /// False only if no line continues this one.
    virtual bool mayBeContinued(std::string_view /*line*/) const { return true; }

private:
    static std::string_view withoutReturn(std::string_view line) noexcept {
        line.remove_suffix(line.ends_with('\r') ? 1 : 0);
        return line;
    }

    const Limits m_limits;
};

} // namespace zrm

#endif
