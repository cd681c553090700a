#ifndef ZRM_HOST_ISO_SHAPE_H
#define ZRM_HOST_ISO_SHAPE_H

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string_view>

namespace zrm::host {

/// A form of eight bytes, which are compared in one step.
class EightBytes {
public:
    /// Every 0 in `form` stands for a digit, anything else for itself.
    consteval explicit EightBytes(const char* form) noexcept {
        Bytes digits{};
        Bytes others{};
        for (std::size_t at = 0; at < digits.size(); ++at) {
            digits[at] = form[at] == '0' ? '\xFF' : '\0';
            others[at] = form[at] == '0' ? '\0' : form[at];
        }
        m_digits = std::bit_cast<Number>(digits);
        m_others = std::bit_cast<Number>(others);
        m_high = m_digits & eight('\xF0');
        m_zeros = m_digits & eight('0');
        m_sixes = m_digits & eight('\6');
    }

    /// Whether eight bytes have the form.
    bool fits(const char* text) const noexcept {
        Number bytes = 0;
        std::memcpy(&bytes, text, sizeof bytes);
        // From '0' to '9' the upper half of a byte is the same, also after 6 has been added.
        return (bytes & ~m_digits) == m_others && (bytes & m_high) == m_zeros &&
               ((bytes + m_sixes) & m_high) == m_zeros;
    }

private:
    using Number = std::uint64_t;
    using Bytes = std::array<char, sizeof(Number)>;

    static consteval Number eight(char character) noexcept {
        Bytes bytes{};
        bytes.fill(character);
        return std::bit_cast<Number>(bytes);
    }

    Number m_digits = 0; ///< all bits of each digit
    Number m_others = 0;
    Number m_high = 0;
    Number m_zeros = 0;
    Number m_sixes = 0;
};

/// "YYYY-MM-DD hh:mm:ss", with a blank or a T in the middle: the commonest form of a time.
namespace IsoShape {

constexpr std::size_t length = 19;

/// Whether a text begins so. The numbers may be out of range.
inline bool begins(std::string_view text) noexcept {
    constexpr EightBytes date("0000-00-");
    constexpr EightBytes time("00:00:00");
    const auto isDigit = [text](std::size_t at) { return text[at] >= '0' && text[at] <= '9'; };
    return text.size() >= length && date.fits(text.data()) && isDigit(8) && isDigit(9) &&
           (text[10] == ' ' || text[10] == 'T') && time.fits(text.data() + 11);
}

} // namespace IsoShape

} // namespace zrm::host

#endif
