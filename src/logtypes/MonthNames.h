#ifndef ZRM_MONTH_NAMES_H
#define ZRM_MONTH_NAMES_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <string_view>

namespace zrm {

/// The months as system loggers write them.
namespace MonthNames {

inline constexpr std::string_view names = "JanFebMarAprMayJunJulAugSepOctNovDec";

constexpr std::uint32_t threeLetters(const char* text) {
    std::uint32_t letters = 0;
    for (int at = 0; at < 3; ++at) {
        letters = letters << 8U | static_cast<unsigned char>(text[at]);
    }
    return letters;
}

constexpr auto lettersOfMonths() {
    std::array<std::uint32_t, names.size() / 3> letters{};
    for (std::size_t month = 0; month < letters.size(); ++month) {
        letters[month] = threeLetters(names.data() + 3 * month);
    }
    return letters;
}

inline constexpr auto months = lettersOfMonths();

/// The month's number, 1 to 12, or 0 if the three characters are not a month. Tries `likely` first.
inline unsigned number(const char* text, unsigned likely) {
    const std::uint32_t letters = threeLetters(text);
    if (likely - 1 < months.size() && months[likely - 1] == letters) {
        return likely;
    }
    for (unsigned month = 0; month < months.size(); ++month) {
        if (months[month] == letters) {
            return month + 1;
        }
    }
    return 0;
}

} // namespace MonthNames

} // namespace zrm

#endif
