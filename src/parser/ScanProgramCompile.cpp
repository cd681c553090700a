#include "parser/DirectiveRules.h"
#include "parser/ScanProgram.h"

#include <algorithm>
#include <climits>
#include <cstring>

#include <langinfo.h>

namespace zrm {

// Compiles a scan directive, once per format; ScanProgram.cpp runs it on every line.

namespace {

/// The characters that "%s" accepts.
constexpr auto wordCharacters = [] {
    std::array<bool, 256> accepted{};
    for (int character = 1; character < 256; ++character) {
        accepted[static_cast<unsigned>(character)] = !isWhiteSpace(static_cast<char>(character));
    }
    return accepted;
}();

/// How an integer conversion reads its number.
struct IntegerCode {
    char code;
    unsigned base;
    bool isSigned;
};
constexpr IntegerCode integerCodes[] = {
    {'d', 10, true}, {'i', 0, true}, {'o', 8, false}, {'u', 10, false}, {'x', 16, false},
};

} // namespace

void ScanProgram::compile(const char* directive, unsigned textWidth) noexcept {
    m_literal = m_literalEnd = directive;
    while (*m_literalEnd != '\0' && (m_literalEnd[0] != '%' || m_literalEnd[1] == '%')) {
        m_literalEnd += *m_literalEnd == '%' ? 2 : 1;
    }
    if (*m_literalEnd == '\0') {
        return;
    }
    const bool isOne = m_literalEnd - m_literal == 1;
    m_isOneSpace = isOne && isWhiteSpace(*m_literal);
    m_isOneCharacter = isOne && !m_isOneSpace;
    const char* point = nl_langinfo(RADIXCHAR);
    const std::size_t pointSize = std::strlen(point) + 1;
    if (*point != '\0' && pointSize <= sizeof m_decimalPoint) {
        std::memcpy(m_decimalPoint, point, pointSize);
    }
    const char* position = m_literalEnd + 1;
    m_isSuppressed = *position == '*';
    position += m_isSuppressed ? 1 : 0;
    m_width = 0;
    for (; isDigit(*position); ++position) {
        m_width = m_width * 10 + static_cast<unsigned>(*position - '0');
    }
    for (const SizeModifier& modifier : sizeModifiers) {
        if (std::strncmp(position, modifier.text.data(), modifier.text.size()) == 0) {
            position = compileConversion(position + modifier.text.size(),
                                         static_cast<unsigned>(modifier.base));
            break;
        }
    }
    if (m_width == 0) {
        m_width = m_kind == Kind::CHARACTERS              ? 1
                  : m_kind == Kind::TEXT && textWidth > 0 ? textWidth
                                                          : UINT_MAX;
    }
    constexpr unsigned mostDigits = 9; // this many fit into 32 bits, signed or not
    m_fewDigits = std::min(m_width, mostDigits);
    m_isCounted = consumedCount == position;
}

/// Returns the position after the conversion.
const char* ScanProgram::compileConversion(const char* conversion, unsigned base) noexcept {
    for (const ConversionCode& candidate : conversionCodes) {
        if (!candidate.scans || candidate.code != *conversion) {
            continue;
        }
        const DataTypeInfo* info =
            findDataType(static_cast<_DataType>(static_cast<int>(base) + candidate.number));
        if (info == nullptr) {
            break;
        }
        m_receiver = info->receiver;
        switch (m_receiver) {
        case Receiver::INTEGER2:
        case Receiver::INTEGER4:
        case Receiver::INTEGER8:
            m_kind = Kind::INTEGER;
            for (const IntegerCode& integer : integerCodes) {
                if (integer.code == *conversion) {
                    m_base = integer.base;
                    m_isSigned = integer.isSigned;
                }
            }
            return conversion + 1;
        case Receiver::FLOAT:
        case Receiver::DOUBLE:
        case Receiver::LONG_DOUBLE:
            m_kind = Kind::FLOATING;
            return conversion + 1;
        case Receiver::CHARACTER:
            m_kind = Kind::CHARACTERS;
            return conversion + 1;
        case Receiver::TEXT:
            m_kind = Kind::TEXT;
            m_accepted = wordCharacters.data();
            return *conversion == '[' ? compileSet(conversion + 1) : conversion + 1;
        }
    }
    return conversion;
}

/// Reads a scan set that starts after its '[', as the C library does: "a-f" is a range if its ends
/// are in order, and a '-' or ']' that comes first is literal. Returns the position after the ']'.
const char* ScanProgram::compileSet(const char* set) noexcept {
    m_skipsWhiteSpace = false;
    m_accepted = m_set.data();
    const bool isInverted = *set == '^';
    set += isInverted ? 1 : 0;
    CharacterSet named{};
    if (*set == ']' || *set == '-') {
        named[byteOf(*set++)] = true;
    }
    for (; *set != '\0' && *set != ']'; ++set) {
        if (*set == '-' && set[1] != '\0' && set[1] != ']' && byteOf(set[-1]) <= byteOf(set[1])) {
            for (unsigned member = byteOf(set[-1]); member < byteOf(set[1]); ++member) {
                named[member] = true;
            }
        } else {
            named[byteOf(*set)] = true;
        }
    }
    int refused = 0;
    for (std::size_t member = 1; member < named.size(); ++member) {
        m_set[member] = named[member] != isInverted;
        if (!m_set[member]) {
            ++refused;
            m_stop = static_cast<char>(member);
        }
    }
    m_isUntil = refused == 1;
    return *set == ']' ? set + 1 : set;
}

} // namespace zrm
