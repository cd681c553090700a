#ifndef ZRM_HOST_EVENT_TEXT_H
#define ZRM_HOST_EVENT_TEXT_H

#include <array>
#include <cstdint>
#include <string>
#include <string_view>

namespace zrm::host {

/// A text that readers look for in events. Letters A to Z are found in either case. Immutable, so
/// any thread.
class EventText {
public:
    /// The empty text is in every event.
    explicit EventText(std::string_view text);

    bool isEmpty() const noexcept { return m_whole.isEmpty(); }

    /// Whether the text is in the log's whole path, the situation's name, or a character column of
    /// the row other than the node and the times. `document` is the event's JSON; in one that
    /// cannot be parsed, whether its bytes have the text.
    bool isIn(std::string_view log, std::string_view document) const;

private:
    /// Finds one text in others, skipping what cannot begin it (Horspool's algorithm).
    class Pattern {
    public:
        explicit Pattern(std::string lowerCase);
        bool isEmpty() const noexcept { return m_text.empty(); }
        bool isIn(std::string_view text) const noexcept;

    private:
        std::string m_text;                     ///< in lower case
        std::array<std::uint8_t, 256> m_skip{}; ///< by the byte below the pattern's last one
    };

    Pattern m_whole;
    Pattern m_plain; ///< its longest part that JSON never escapes
};

} // namespace zrm::host

#endif
