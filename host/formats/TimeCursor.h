#ifndef ZRM_HOST_TIME_CURSOR_H
#define ZRM_HOST_TIME_CURSOR_H

#include "logs/EntryFormat.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>

namespace zrm::host {

/// Takes the parts of a time off the beginning of a text. What does not match stays.
class TimeCursor {
public:
    explicit TimeCursor(std::string_view text) noexcept : m_text(text) {}

    static bool isDigit(char character) noexcept { return character >= '0' && character <= '9'; }
    static bool isLetter(char character) noexcept {
        const char lower = static_cast<char>(character | 0x20);
        return lower >= 'a' && lower <= 'z';
    }

    bool atEnd() const noexcept { return m_text.empty(); }
    /// The character that comes next, or another one; NUL behind the end.
    char next(std::size_t ahead = 0) const noexcept {
        return ahead < m_text.size() ? m_text[ahead] : '\0';
    }
    std::size_t digits() const noexcept {
        std::size_t count = 0;
        while (isDigit(next(count))) {
            ++count;
        }
        return count;
    }
    /// What has not been taken.
    std::string_view rest() const noexcept { return m_text; }
    void skip(std::size_t characters) noexcept { m_text.remove_prefix(characters); }
    bool take(char character) noexcept {
        const bool isNext = m_text.starts_with(character);
        skip(isNext ? 1 : 0);
        return isNext;
    }
    bool takeOneOf(std::string_view characters) noexcept {
        const bool isNext =
            !atEnd() && std::ranges::find(characters, m_text[0]) != characters.end();
        skip(isNext ? 1 : 0);
        return isNext;
    }
    /// At least one blank, tab or narrow no-break space.
    bool takeBlanks() noexcept;
    /// A number of so many digits; takes as many as it can.
    bool takeNumber(std::size_t least, std::size_t most, unsigned& number) noexcept;
    /// One to nine digits.
    bool takeFraction() noexcept;
    /// An English name, abbreviated or not, in any case: 1 to 12.
    bool takeMonth(unsigned& month) noexcept;
    /// An English name, abbreviated or not, in any case.
    bool takeWeekday() noexcept;
    /// "AM" or "PM" in any case.
    bool takeMeridiem(bool& isAfternoon) noexcept;
    /// An offset from UTC ("Z", "+01:00", "+0100", "+01"), a zone's abbreviation that is known, or
    /// "UTC" or "GMT" with an offset behind it. An abbreviation that stands for several offsets
    /// gives none.
    bool takeZone(std::optional<std::int32_t>& offset) noexcept;
    /// Letters, digits, slashes and underscores, as in "Europe/Berlin".
    bool takeWord() noexcept;

private:
    std::size_t letters() const noexcept {
        std::size_t count = 0;
        while (isLetter(next(count))) {
            ++count;
        }
        return count;
    }
    /// Takes a word that is the beginning of a name, of at least three letters.
    bool takeName(std::string_view name) noexcept;

    std::string_view m_text;
};

} // namespace zrm::host

#endif
