#ifndef ZRM_HOST_STREAM_ENTRIES_H
#define ZRM_HOST_STREAM_ENTRIES_H

#include "logs/LineJoin.h"

#include <chrono>
#include <cstddef>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm::host {

/// The lines of a stream that is read in blocks. Of a longer line than entries may have only the
/// beginning is given. One thread.
class StreamLines {
public:
    StreamLines();

    void clear() noexcept { m_begin = m_end = 0, m_isSkipping = false; }
    /// The next whole line, terminated and without its end; null if there is none.
    char* next() noexcept;
    /// The last line, which has no end; null if there is none.
    char* rest() noexcept;
    /// Room to read into, once there is no further line.
    std::pair<char*, std::size_t> room() noexcept;
    void add(std::size_t count) noexcept { m_end += count; }

    /// Of the last line.
    std::string_view text() const noexcept { return m_text; }
    bool isCut() const noexcept { return m_isCut; }

private:
    char* cut() noexcept;
    char* give(char* begin, std::size_t length) noexcept;

    std::vector<char> m_room;
    std::size_t m_begin = 0;
    std::size_t m_end = 0;
    bool m_isSkipping = false; ///< until the end of the line
    bool m_isCut = false;
    std::string_view m_text;
};

/// The entries of a stream: its lines, or what a LineJoin makes of them. One thread.
class StreamEntries {
public:
    using Clock = std::chrono::steady_clock;

    /// Null: each line is an entry. Outlives the object.
    explicit StreamEntries(const LineJoin* join) : m_join(join) {}

    /// A new stream begins. What was left of the last one is forgotten.
    void begin() noexcept;
    std::pair<char*, std::size_t> room() noexcept { return m_lines.room(); }
    void add(std::size_t count) noexcept { m_lines.add(count); }
    /// Nothing more comes.
    void end() noexcept { m_hasEnded = true; }

    /// The next entry, terminated; null if there is none yet. It and its text are valid until the
    /// next call.
    char* next();
    std::string_view text() const noexcept { return m_join ? m_given : m_lines.text(); }
    bool isCut() const noexcept { return m_join ? m_isGivenCut : m_lines.isCut(); }
    /// How long to wait for the stream at most: until the last lines need not wait for others.
    std::chrono::milliseconds patience(std::chrono::milliseconds most) const noexcept;

private:
    char* nextLine() noexcept;
    bool takes(std::string_view line) const;
    void append(std::string_view line);
    char* give() noexcept;

    const LineJoin* const m_join;
    StreamLines m_lines;
    bool m_hasEnded = false;
    // The entry that is being built.
    std::string m_text;
    std::size_t m_count = 0;   ///< its lines
    std::size_t m_last = 0;    ///< where the last of them begins
    bool m_isCut = false;      ///< its only line is longer
    bool m_isComplete = false; ///< no line continues it
    Clock::time_point m_since; ///< its last line
    // The entry that was given last.
    std::string m_given;
    bool m_isGivenCut = false;
};

} // namespace zrm::host

#endif
