#ifndef ZRM_DIGIT_PAIRS_H
#define ZRM_DIGIT_PAIRS_H

#include <array>
#include <cstring>

namespace zrm {

/// The numbers 0 to 99 as two digits each. Saves the per-line path its divisions.
namespace DigitPairs {

inline constexpr auto texts = [] {
    std::array<char, 200> digits{};
    for (std::size_t number = 0; number < 100; ++number) {
        digits[2 * number] = static_cast<char>('0' + number / 10);
        digits[2 * number + 1] = static_cast<char>('0' + number % 10);
    }
    return digits;
}();

/// Writes a number of at most 99 as two digits.
inline void put(char* out, unsigned number) noexcept {
    std::memcpy(out, texts.data() + 2 * number, 2);
}

} // namespace DigitPairs

} // namespace zrm

#endif
