#include "host/formats/TimeCursor.h"

#include "logs/ZoneTime.h"

#include <algorithm>
#include <array>

namespace zrm::host {

namespace {

constexpr std::array<std::string_view, 12> months = {
    "january", "february", "march",     "april",   "may",      "june",
    "july",    "august",   "september", "october", "november", "december"};
constexpr std::array<std::string_view, 7> weekdays = {"sunday",   "monday", "tuesday", "wednesday",
                                                      "thursday", "friday", "saturday"};
constexpr std::string_view narrowBlank = "\u202F"; ///< before AM and PM in newer Java

constexpr std::int32_t minutes = 60;
constexpr std::int32_t hours = 60 * minutes;

struct Zone {
    std::string_view name;
    std::optional<std::int32_t> offset;
};

/// Abbreviations of zones. Those that logs use for several offsets have none: CST and CDT (America,
/// China, Cuba), IST (India, Ireland, Israel).
constexpr std::array zones = {Zone{"ACDT", 10 * hours + 30 * minutes},
                              Zone{"ACST", 9 * hours + 30 * minutes},
                              Zone{"ADT", -3 * hours},
                              Zone{"AEDT", 11 * hours},
                              Zone{"AEST", 10 * hours},
                              Zone{"AKDT", -8 * hours},
                              Zone{"AKST", -9 * hours},
                              Zone{"AST", -4 * hours},
                              Zone{"AWST", 8 * hours},
                              Zone{"BST", 1 * hours},
                              Zone{"CAT", 2 * hours},
                              Zone{"CDT", std::nullopt},
                              Zone{"CEST", 2 * hours},
                              Zone{"CET", 1 * hours},
                              Zone{"CST", std::nullopt},
                              Zone{"EAT", 3 * hours},
                              Zone{"EDT", -4 * hours},
                              Zone{"EEST", 3 * hours},
                              Zone{"EET", 2 * hours},
                              Zone{"EST", -5 * hours},
                              Zone{"GMT", 0},
                              Zone{"HDT", -9 * hours},
                              Zone{"HKT", 8 * hours},
                              Zone{"HST", -10 * hours},
                              Zone{"IDT", 3 * hours},
                              Zone{"IST", std::nullopt},
                              Zone{"JST", 9 * hours},
                              Zone{"KST", 9 * hours},
                              Zone{"MDT", -6 * hours},
                              Zone{"MSK", 3 * hours},
                              Zone{"MST", -7 * hours},
                              Zone{"NDT", -2 * hours - 30 * minutes},
                              Zone{"NST", -3 * hours - 30 * minutes},
                              Zone{"NZDT", 13 * hours},
                              Zone{"NZST", 12 * hours},
                              Zone{"PDT", -7 * hours},
                              Zone{"PKT", 5 * hours},
                              Zone{"PST", -8 * hours},
                              Zone{"SAST", 2 * hours},
                              Zone{"UTC", 0},
                              Zone{"WAT", 1 * hours},
                              Zone{"WEST", 1 * hours},
                              Zone{"WET", 0},
                              Zone{"WIB", 7 * hours},
                              Zone{"WIT", 9 * hours},
                              Zone{"WITA", 8 * hours},
                              Zone{"Z", 0}};
static_assert(std::ranges::is_sorted(zones, {}, &Zone::name));

char lower(char character) noexcept {
    return static_cast<char>(character | 0x20);
}

} // namespace

bool TimeCursor::takeBlanks() noexcept {
    const std::size_t before = m_text.size();
    for (;;) {
        if (next() == ' ' || next() == '\t') {
            skip(1);
        } else if (m_text.starts_with(narrowBlank)) {
            skip(narrowBlank.size());
        } else {
            return m_text.size() < before;
        }
    }
}

bool TimeCursor::takeNumber(std::size_t least, std::size_t most, unsigned& number) noexcept {
    unsigned value = 0;
    std::size_t count = 0;
    for (; count < most && isDigit(next(count)); ++count) {
        value = value * 10 + static_cast<unsigned>(m_text[count] - '0');
    }
    if (count < least) {
        return false;
    }
    skip(count);
    number = value;
    return true;
}

bool TimeCursor::takeFraction() noexcept {
    constexpr std::size_t longest = 9;
    const std::size_t count = digits();
    if (count == 0 || count > longest) {
        return false;
    }
    skip(count);
    return true;
}

bool TimeCursor::takeName(std::string_view name) noexcept {
    constexpr std::size_t abbreviated = 3;
    const std::size_t length = letters();
    if (length != abbreviated && length != name.size()) {
        return false;
    }
    for (std::size_t at = 0; at < length; ++at) {
        if (lower(m_text[at]) != name[at]) {
            return false;
        }
    }
    skip(length);
    return true;
}

bool TimeCursor::takeMonth(unsigned& month) noexcept {
    for (unsigned index = 0; index < months.size(); ++index) {
        if (lower(next()) == months[index][0] && takeName(months[index])) {
            month = index + 1;
            return true;
        }
    }
    return false;
}

bool TimeCursor::takeWeekday() noexcept {
    return std::any_of(weekdays.begin(), weekdays.end(), [this](std::string_view name) {
        return lower(next()) == name[0] && takeName(name);
    });
}

bool TimeCursor::takeMeridiem(bool& isAfternoon) noexcept {
    const char half = lower(next());
    if (letters() != 2 || (half != 'a' && half != 'p') || lower(next(1)) != 'm') {
        return false;
    }
    isAfternoon = half == 'p';
    skip(2);
    return true;
}

bool TimeCursor::takeZone(std::optional<std::int32_t>& offset) noexcept {
    if (next() == '+' || next() == '-') {
        offset = ZoneTime::takeOffset(m_text);
        return offset.has_value();
    }
    constexpr std::size_t longest = 5;
    const std::size_t length = letters();
    if (length == 1 && length == m_text.size() && lower(next()) == 'z') {
        skip(length);
        offset = 0;
        return true;
    }
    if (length == 0 || length > longest) {
        return false;
    }
    char name[longest];
    std::transform(m_text.begin(), m_text.begin() + length, name,
                   [](char letter) { return static_cast<char>(letter & ~0x20); });
    const std::string_view word(name, length);
    const auto zone = std::ranges::lower_bound(zones, word, {}, &Zone::name);
    if (zone == zones.end() || zone->name != word) {
        return false;
    }
    skip(length);
    offset = zone->offset;
    if (offset == 0 && (next() == '+' || next() == '-')) {
        offset = ZoneTime::takeOffset(m_text);
        return offset.has_value();
    }
    return true;
}

bool TimeCursor::takeWord() noexcept {
    const auto isPart = [](char character) {
        return isLetter(character) || isDigit(character) || character == '/' || character == '_';
    };
    const auto end = std::find_if_not(m_text.begin(), m_text.end(), isPart);
    const auto length = static_cast<std::size_t>(end - m_text.begin());
    skip(length);
    return length > 0;
}

} // namespace zrm::host
