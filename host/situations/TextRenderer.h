#ifndef ZRM_HOST_TEXT_RENDERER_H
#define ZRM_HOST_TEXT_RENDERER_H

#include "host/config/HostConfig.h"
#include "host/config/TextTemplate.h"
#include "host/events/Episode.h"
#include "host/situations/EntryValue.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// What the text of an event may say beside the values of its entry.
struct TextFacts {
    std::uint64_t count = 1; ///< entries that were counted
    std::int64_t first = 0;  ///< time of the first of them: milliseconds since 1970, UTC
    std::int64_t last = 0;   ///< time of the last
    std::string_view log;    ///< full path, UTF-8

    // For events without an entry.
    std::span<const GroupValue> group;
    std::span<const GroupValue> values; ///< of the entry that raised the episode
};

/// Makes the texts of a situation's events, for people: on one line, in UTF-8, of a bounded length.
/// Immutable, so any thread.
class TextRenderer {
public:
    static constexpr std::size_t longestValue = 1024; ///< bytes of a value; more is cut off
    static constexpr std::size_t longestText = 4096;  ///< bytes; more is cut off

    /// The situation is a valid one.
    explicit TextRenderer(const SituationConfig& situation);

    /// False: every event has the situation's own text, and nothing is rendered.
    bool isNeeded() const noexcept { return !m_parts.empty(); }

    /// The text of an event that an entry has raised. Times in columns are as UtcTime writes them.
    std::string text(EntryReading& entry, const TextFacts& facts) const;

    /// The text of an event without an entry: the values of its group and of the entry that raised
    /// the episode, "-" for any other.
    std::string text(const TextFacts& facts) const;

    /// What the text says of the entry, for the events of its episode that have none.
    std::vector<GroupValue> values(EntryReading& entry) const;

private:
    using Kind = TextTemplate::Piece::Kind;

    struct Part {
        Kind kind;
        std::string text;                ///< of a literal; of a value: its name
        std::optional<EntryValue> value; ///< of a value
        bool isTime = false;             ///< the value is a time stamp
    };

    std::string render(EntryReading* entry, const TextFacts& facts) const;
    void appendValue(std::string& out, const Part& part, EntryReading& entry) const;
    static void appendKept(std::string& out, const Part& part, const TextFacts& facts);

    const std::string m_situation;
    std::vector<Part> m_parts;
};

} // namespace zrm::host

#endif
