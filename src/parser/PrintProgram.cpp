#include "parser/PrintProgram.h"

#include "base/DigitPairs.h"
#include "parser/DirectiveRules.h"

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstring>

namespace zrm {

namespace {

/// Fits the longest text that a directive can produce: a long double has up to 4933 digits,
/// thousands grouping adds a third, and the directive's own text adds 255.
constexpr std::size_t workSize = 8192;

template <typename Type> Type valueAt(const void* value) {
    Type result;
    std::memcpy(&result, value, sizeof result);
    return result;
}

/// The integer extended to full width, with its sign only for signed conversions.
std::int64_t integerAt(const void* value, Receiver receiver, bool isSigned) {
    if (receiver == Receiver::INTEGER2) {
        return isSigned ? valueAt<std::int16_t>(value) : valueAt<std::uint16_t>(value);
    }
    if (receiver == Receiver::INTEGER4) {
        return isSigned ? std::int64_t{valueAt<std::int32_t>(value)}
                        : std::int64_t{valueAt<std::uint32_t>(value)};
    }
    return valueAt<std::int64_t>(value);
}

bool isInteger(Receiver receiver) {
    return receiver == Receiver::INTEGER2 || receiver == Receiver::INTEGER4 ||
           receiver == Receiver::INTEGER8;
}

constexpr std::size_t smallLength = 4;

/// Prints a small number that needs no padding, such as a part of a time. Returns false and prints
/// nothing for others. The buffer must have room for smallLength characters.
inline bool printSmall(std::uint32_t number, std::size_t width, _FormatBuffer& buffer) {
    if (number < 10 && width <= 1) {
        *buffer.position = static_cast<char>('0' + number);
        buffer.advance(1);
        return true;
    }
    if (number >= 10 && number < 100 && width <= 2) {
        DigitPairs::put(buffer.position, number);
        buffer.advance(2);
        return true;
    }
    if (number >= 1000 && number < 10000 && width <= smallLength) {
        DigitPairs::put(buffer.position, number / 100);
        DigitPairs::put(buffer.position + 2, number % 100);
        buffer.advance(smallLength);
        return true;
    }
    return false;
}

} // namespace

bool PrintProgram::compile(const char* directive, _DataType type) noexcept {
    const DataTypeInfo* info = findDataType(type);
    m_directive = info != nullptr ? directive : nullptr;
    if (info == nullptr) {
        return false;
    }
    m_receiver = info->receiver;
    const char* conversion = std::strchr(directive, '%');
    m_prefixLength = conversion != nullptr ? static_cast<std::size_t>(conversion - directive)
                                           : std::strlen(directive);
    m_kind = conversion != nullptr ? classify(conversion + 1) : Kind::CONSTANT;
    m_isBareInteger = m_kind == Kind::INTEGER && m_receiver == Receiver::INTEGER4 &&
                      m_prefixLength + m_suffixLength == 0;
    return true;
}

/// Detects a directive that does not need the C library: at most zero padding and a minimum width,
/// and no second '%'.
PrintProgram::Kind PrintProgram::classify(const char* conversion) noexcept {
    m_fill = *conversion == '0' ? '0' : ' ';
    conversion += *conversion == '0' ? 1 : 0;
    const char* const width = conversion;
    for (m_width = 0; isDigit(*conversion); ++conversion) {
        m_width = m_width * 10 + static_cast<std::size_t>(*conversion - '0');
    }
    const bool isPlain = conversion == width && m_fill == ' ';
    for (const SizeModifier& modifier : sizeModifiers) {
        if (std::strncmp(conversion, modifier.text.data(), modifier.text.size()) == 0) {
            conversion += modifier.text.size();
            break;
        }
    }
    m_suffix = conversion + (*conversion != '\0' ? 1 : 0);
    m_suffixLength = std::strlen(m_suffix);
    if (std::strchr(m_suffix, '%') != nullptr) {
        return Kind::LIBRARY;
    }
    m_isSigned = *conversion != 'u';
    if (isInteger(m_receiver) && (*conversion == 'd' || *conversion == 'i' || *conversion == 'u')) {
        return Kind::INTEGER;
    }
    if (isPlain && m_receiver == Receiver::TEXT && *conversion == 's') {
        return Kind::TEXT;
    }
    if (isPlain && m_receiver == Receiver::CHARACTER && *conversion == 'c') {
        return Kind::CHARACTER;
    }
    return Kind::LIBRARY;
}

bool PrintProgram::run(const void* value, _FormatBuffer& buffer) const noexcept {
    // Cast to unsigned, a negative number is large.
    if (m_isBareInteger && buffer.room >= static_cast<long>(smallLength) &&
        printSmall(valueAt<std::uint32_t>(value), m_width, buffer)) {
        return true;
    }
    return print(value, buffer);
}

bool PrintProgram::print(const void* value, _FormatBuffer& buffer) const noexcept {
    if (m_kind == Kind::LIBRARY) {
        return printByLibrary(value, buffer);
    }
    buffer.append(m_directive, m_prefixLength);
    switch (m_kind) {
    case Kind::TEXT: {
        const auto* text = static_cast<const char*>(value);
        buffer.append(text, std::strlen(text));
        break;
    }
    case Kind::CHARACTER:
        buffer.append(static_cast<const char*>(value), 1);
        break;
    case Kind::INTEGER:
        printInteger(value, buffer);
        break;
    case Kind::CONSTANT:
    case Kind::LIBRARY:
        break;
    }
    buffer.append(m_suffix, m_suffixLength);
    return true;
}

void PrintProgram::printInteger(const void* value, _FormatBuffer& buffer) const noexcept {
    const std::int64_t number = integerAt(value, m_receiver, m_isSigned);
    const bool isNegative = m_isSigned && number < 0;
    auto magnitude = static_cast<std::uint64_t>(number);
    if (isNegative) {
        magnitude = 0 - magnitude;
    }
    std::size_t length = isNegative ? 2 : 1;
    for (std::uint64_t rest = magnitude; rest >= 10; rest /= 10) {
        ++length;
    }
    length = std::max(length, m_width);
    // Written from its right end: in place if it fits there, else cut afterwards.
    char cut[maxPrintWidth + 1];
    const bool fits = buffer.room >= static_cast<long>(length);
    char* const begin = fits ? buffer.position : cut;
    char* next = begin + length;
    do {
        *--next = static_cast<char>('0' + magnitude % 10);
        magnitude /= 10;
    } while (magnitude != 0);
    if (isNegative && m_fill == ' ') {
        *--next = '-';
    }
    while (next != begin) {
        *--next = m_fill;
    }
    if (isNegative && m_fill == '0') {
        *begin = '-'; // zeros go after the sign
    }
    if (fits) {
        buffer.advance(length);
    } else {
        buffer.append(cut, length);
    }
}

bool PrintProgram::printByLibrary(const void* value, _FormatBuffer& buffer) const noexcept {
    char work[workSize];
    int length = -1;
    switch (m_receiver) {
    case Receiver::INTEGER2:
        length = std::snprintf(work, sizeof work, m_directive, int{valueAt<std::int16_t>(value)});
        break;
    case Receiver::INTEGER4:
        length = std::snprintf(work, sizeof work, m_directive, valueAt<std::int32_t>(value));
        break;
    case Receiver::INTEGER8:
        length = std::snprintf(work, sizeof work, m_directive, valueAt<std::int64_t>(value));
        break;
    case Receiver::FLOAT:
        length = std::snprintf(work, sizeof work, m_directive, double{valueAt<float>(value)});
        break;
    case Receiver::DOUBLE:
        length = std::snprintf(work, sizeof work, m_directive, valueAt<double>(value));
        break;
    case Receiver::LONG_DOUBLE:
        length = std::snprintf(work, sizeof work, m_directive, valueAt<long double>(value));
        break;
    case Receiver::TEXT:
        length = std::snprintf(work, sizeof work, m_directive, static_cast<const char*>(value));
        break;
    case Receiver::CHARACTER:
        length = std::snprintf(work, sizeof work, m_directive,
                               static_cast<unsigned char>(*static_cast<const char*>(value)));
        break;
    }
    if (length < 0) {
        return false;
    }
    const auto written = static_cast<std::size_t>(length);
    buffer.append(work, written < sizeof work ? written : sizeof work - 1);
    return true;
}

} // namespace zrm
