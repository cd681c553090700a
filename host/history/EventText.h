#ifndef ZRM_HOST_EVENT_TEXT_H
#define ZRM_HOST_EVENT_TEXT_H

#include <array>
#include <cstdint>
#include <string>
#include <string_view>

namespace zrm::host {

/// A text to search for in events. The letters A to Z match in either case. Immutable, so any
/// thread.
class EventText {
public:
    /// The empty text matches every event.
    explicit EventText(std::string_view text);

    bool isEmpty() const noexcept { return m_whole.isEmpty(); }

    /// Whether the text occurs in the log's full path, the situation's name, the entry, a field, a
    /// group value, or a character column of the row other than the node and the times. `document`
    /// is the event's JSON; if it cannot be parsed, its raw bytes are searched.
    bool isIn(std::string_view log, std::string_view document) const;

private:
    /// Finds one text in others by Horspool's algorithm.
    class Pattern {
    public:
        explicit Pattern(std::string lowerCase);
        bool isEmpty() const noexcept { return m_text.empty(); }
        bool isIn(std::string_view text) const noexcept;

    private:
        std::string m_text;                     ///< in lower case
        std::array<std::uint8_t, 256> m_skip{}; ///< by the byte aligned with the pattern's last one
    };

    Pattern m_whole;
    Pattern m_plain; ///< the longest part of the text that JSON never escapes
};

} // namespace zrm::host

#endif
