#include "parser/ScanProgram.h"

#include "parser/DirectiveRules.h"
#include "parser/FloatField.h"

#include <cstring>
#include <limits>

namespace zrm {

namespace {

constexpr unsigned char noDigit = 255;

/// The value of each digit, or noDigit for other characters.
constexpr auto digitValues = [] {
    std::array<unsigned char, 256> values{};
    values.fill(noDigit);
    for (unsigned char digit = 0; digit < 10; ++digit) {
        values[byteOf('0') + digit] = digit;
    }
    for (unsigned char digit = 0; digit < 6; ++digit) {
        values[byteOf('a') + digit] = values[byteOf('A') + digit] =
            static_cast<unsigned char>(10 + digit);
    }
    return values;
}();

/// Reads at most `width` digits of a base. Returns the position after them.
template <unsigned Base>
const char* readDigits(const char* position, unsigned width, std::uint64_t& magnitude,
                       bool& overflowed) {
    constexpr std::uint64_t most = std::numeric_limits<std::uint64_t>::max();
    constexpr unsigned safeDigits = 16; // this many digits never overflow
    unsigned safe = width < safeDigits ? width : safeDigits;
    unsigned left = width - safe;
    unsigned digit = 0;
    while (safe > 0 && (digit = digitValues[byteOf(*position)]) < Base) {
        magnitude = magnitude * Base + digit;
        ++position;
        --safe;
    }
    while (safe == 0 && left > 0 && (digit = digitValues[byteOf(*position)]) < Base) {
        overflowed = overflowed || magnitude > most / Base ||
                     (magnitude == most / Base && digit > most % Base);
        magnitude = magnitude * Base + digit;
        ++position;
        --left;
    }
    return position;
}

template <typename Integer> void store(std::uint64_t bits, void* value) {
    const auto number = static_cast<Integer>(bits);
    std::memcpy(value, &number, sizeof number);
}

} // namespace

/// Reads a few digits with nothing before them, as in most logs. Returns false and reads nothing
/// for anything else.
inline bool ScanProgram::scanShortNumber(const char*& position, void* value) const noexcept {
    const char* next = position;
    const char* const limit = position + m_fewDigits;
    std::uint32_t number = 0;
    for (unsigned digit; next != limit && (digit = byteOf(*next) - unsigned{'0'}) < 10; ++next) {
        number = number * 10 + digit;
    }
    if (next == position || (next == limit && m_fewDigits != m_width)) {
        return false;
    }
    position = next;
    if (value != nullptr) {
        // Too small to exceed any type's range except the shortest, for which it is cut.
        if (m_receiver == Receiver::INTEGER4) {
            store<std::int32_t>(number, value);
        } else if (m_receiver == Receiver::INTEGER2) {
            store<std::int16_t>(number, value);
        } else {
            store<std::int64_t>(number, value);
        }
    }
    return true;
}

int ScanProgram::run(const char* text, void* value) const noexcept {
    if (m_kind == Kind::INTEGER && m_base == 10 && m_isCounted) {
        const char* position = text;
        if (skipShortLiteral(position) &&
            scanShortNumber(position, m_isSuppressed ? nullptr : value)) {
            return static_cast<int>(position - text);
        }
    }
    return scan(text, value);
}

/// Skips leading text that is empty or one character.
inline bool ScanProgram::skipShortLiteral(const char*& position) const noexcept {
    if (m_isOneCharacter) {
        return *position++ == *m_literal;
    }
    if (m_isOneSpace) {
        position = skipWhiteSpace(position);
        return true;
    }
    return m_literal == m_literalEnd;
}

int ScanProgram::scan(const char* text, void* value) const noexcept {
    const char* position = text;
    Outcome outcome = matchLiteral(position);
    if (outcome == Outcome::MATCHED) {
        void* const receiver = m_isSuppressed ? nullptr : value;
        switch (m_kind) {
        case Kind::INTEGER:
            outcome = scanInteger(position, receiver);
            break;
        case Kind::FLOATING:
            outcome = scanFloating(position, receiver);
            break;
        case Kind::TEXT:
            outcome = scanText(position, static_cast<char*>(receiver));
            break;
        case Kind::CHARACTERS:
            outcome = scanCharacters(position, static_cast<char*>(receiver));
            break;
        case Kind::NOTHING:
            outcome = Outcome::MISMATCHED;
            break;
        }
    }
    if (outcome == Outcome::END) {
        return endOfInput;
    }
    return outcome == Outcome::MATCHED && m_isCounted ? static_cast<int>(position - text)
                                                      : mismatch;
}

ScanProgram::Place ScanProgram::findValue(const char* text) const noexcept {
    const char* position = text;
    if (matchLiteral(position) != Outcome::MATCHED) {
        return {position, false};
    }
    const bool skips = m_kind != Kind::CHARACTERS && m_skipsWhiteSpace;
    return {skips ? skipWhiteSpace(position) : position, true};
}

ScanProgram::Outcome ScanProgram::matchLiteral(const char*& position) const noexcept {
    if (m_isOneCharacter) {
        if (*position != *m_literal) {
            return *position == '\0' ? Outcome::END : Outcome::MISMATCHED;
        }
        ++position;
        return Outcome::MATCHED;
    }
    for (const char* literal = m_literal; literal != m_literalEnd; ++literal) {
        if (isWhiteSpace(*literal)) {
            position = skipWhiteSpace(position);
            continue;
        }
        if (*literal == '%') {
            position = skipWhiteSpace(position);
            ++literal;
        }
        if (*position != *literal) {
            return *position == '\0' ? Outcome::END : Outcome::MISMATCHED;
        }
        ++position;
    }
    return Outcome::MATCHED;
}

ScanProgram::Outcome ScanProgram::scanInteger(const char*& position, void* value) const noexcept {
    const char* next = skipWhiteSpace(position);
    if (*next == '\0') {
        return Outcome::END;
    }
    unsigned left = m_width;
    const bool isNegative = *next == '-';
    if (isNegative || *next == '+') {
        ++next;
        --left;
    }
    unsigned base = m_base;
    bool hasDigits = false;
    if (base != 10 && left > 0 && *next == '0') {
        hasDigits = true; // A prefix without digits after it is the number 0.
        ++next;
        --left;
        if (left > 0 && (*next == 'x' || *next == 'X')) {
            base = base == 0 ? 16 : base;
            if (base == 16) {
                ++next;
                --left;
            }
        } else if (base == 0) {
            base = 8;
        }
    }
    std::uint64_t magnitude = 0;
    bool overflowed = false;
    const char* const digits = next;
    switch (base) {
    case 8:
        next = readDigits<8>(next, left, magnitude, overflowed);
        break;
    case 16:
        next = readDigits<16>(next, left, magnitude, overflowed);
        break;
    default:
        next = readDigits<10>(next, left, magnitude, overflowed);
        break;
    }
    if (next == digits && !hasDigits) {
        return Outcome::MISMATCHED;
    }
    position = next;
    if (value != nullptr) {
        storeInteger(magnitude, isNegative, overflowed, value);
    }
    return Outcome::MATCHED;
}

/// Like the C library, reads every integer as a long, stops at the ends of its range, and cuts the
/// result to the receiving variable.
void ScanProgram::storeInteger(std::uint64_t magnitude, bool isNegative, bool overflowed,
                               void* value) const noexcept {
    std::uint64_t bits = isNegative ? 0 - magnitude : magnitude;
    if (m_isSigned) {
        constexpr std::uint64_t largest = std::numeric_limits<std::int64_t>::max();
        const std::uint64_t limit = isNegative ? largest + 1 : largest;
        if (overflowed || magnitude > limit) {
            bits = limit;
        }
    } else if (overflowed) {
        bits = std::numeric_limits<std::uint64_t>::max();
    }
    if (m_receiver == Receiver::INTEGER2) {
        store<std::int16_t>(bits, value);
    } else if (m_receiver == Receiver::INTEGER4) {
        store<std::int32_t>(bits, value);
    } else {
        store<std::int64_t>(bits, value);
    }
}

ScanProgram::Outcome ScanProgram::scanFloating(const char*& position, void* value) const noexcept {
    const char* const begin = skipWhiteSpace(position);
    if (*begin == '\0') {
        return Outcome::END;
    }
    const char* const end = FloatField::findEnd(begin, m_width, m_decimalPoint);
    if (end == nullptr || !FloatField::convert(begin, end, m_receiver, value)) {
        return Outcome::MISMATCHED;
    }
    position = end;
    return Outcome::MATCHED;
}

/// The end of a text that extends to one stop character. The search covers many bytes at once.
const char* ScanProgram::findStop(const char* begin) const noexcept {
    const std::size_t limit = strnlen(begin, m_width);
    const void* const stop = std::memchr(begin, m_stop, limit);
    return stop != nullptr ? static_cast<const char*>(stop) : begin + limit;
}

/// The end of a text of accepted characters.
const char* ScanProgram::findRefused(const char* begin) const noexcept {
    const char* end = begin;
    for (unsigned left = m_width; left > 0 && m_accepted[byteOf(*end)]; --left) {
        ++end;
    }
    return end;
}

ScanProgram::Outcome ScanProgram::scanText(const char*& position, char* value) const noexcept {
    const char* const begin = m_skipsWhiteSpace ? skipWhiteSpace(position) : position;
    if (*begin == '\0') {
        return Outcome::END;
    }
    const char* const end = m_isUntil ? findStop(begin) : findRefused(begin);
    if (end == begin) {
        return Outcome::MISMATCHED;
    }
    if (value != nullptr) {
        const auto length = static_cast<std::size_t>(end - begin);
        std::memcpy(value, begin, length);
        value[length] = '\0';
    }
    position = end;
    return Outcome::MATCHED;
}

ScanProgram::Outcome ScanProgram::scanCharacters(const char*& position,
                                                 char* value) const noexcept {
    if (*position == '\0') {
        return Outcome::END;
    }
    const char* end = position;
    for (unsigned left = m_width; left > 0 && *end != '\0'; --left) {
        ++end;
    }
    if (value != nullptr) {
        const auto length = static_cast<std::size_t>(end - position);
        std::memcpy(value, position, length);
        if (m_width > 1) {
            value[length] = '\0';
        }
    }
    position = end;
    return Outcome::MATCHED;
}

} // namespace zrm
