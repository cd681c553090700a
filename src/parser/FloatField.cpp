#include "parser/FloatField.h"

#include "parser/DirectiveRules.h"

#include <cstdlib>
#include <cstring>
#include <memory>
#include <new>
#include <string_view>

namespace zrm {

namespace {

constexpr char lowerCase(char character) {
    return character >= 'A' && character <= 'Z' ? static_cast<char>(character - 'A' + 'a')
                                                : character;
}
constexpr bool isHexDigit(char character) {
    return isDigit(character) || (lowerCase(character) >= 'a' && lowerCase(character) <= 'f');
}

/// Walks over the characters that the field may take.
class Cursor {
public:
    Cursor(const char* text, unsigned width) : m_text(text), m_left(width) {}

    /// The current character, or a zero byte at the end of the text or width.
    char peek() const { return m_left > 0 ? *m_text : '\0'; }
    const char* position() const { return m_text; }
    void advance(unsigned count = 1) {
        m_text += count;
        m_left -= count;
    }
    /// True if a hexadecimal prefix is here and the width has room after it.
    bool atHexPrefix() const { return peek() == '0' && m_left > 2 && lowerCase(m_text[1]) == 'x'; }
    /// Takes the word in either case. Returns false if it is not there in full.
    bool take(std::string_view word) {
        for (const char expected : word) {
            if (lowerCase(peek()) != expected) {
                return false;
            }
            advance();
        }
        return true;
    }
    /// Takes the decimal point, which has several bytes in some locales.
    bool takePoint(const char* point) {
        const std::size_t length = std::strlen(point);
        if (length == 0 || length > m_left || std::strncmp(m_text, point, length) != 0) {
            return false;
        }
        advance(static_cast<unsigned>(length));
        return true;
    }

private:
    const char* m_text;
    unsigned m_left;
};

/// Takes digits with a point and an exponent. The lone sign of an exponent, or an exponent without
/// digits, belongs to the field but not to the value.
void takeNumber(Cursor& cursor, bool isHex, const char* decimalPoint) {
    const char exponentMark = isHex ? 'p' : 'e';
    bool hasDigit = false;
    bool hasPoint = false;
    bool hasExponent = false;
    bool behindMark = false;
    for (char c = cursor.peek(); c != '\0'; c = cursor.peek()) {
        if (isDigit(c) || (isHex && !hasExponent && isHexDigit(c))) {
            hasDigit = true;
            behindMark = false;
            cursor.advance();
        } else if (behindMark && (c == '-' || c == '+')) {
            behindMark = false;
            cursor.advance();
        } else if (hasDigit && !hasExponent && lowerCase(c) == exponentMark) {
            hasExponent = behindMark = hasPoint = true;
            cursor.advance();
        } else if (!hasPoint && cursor.takePoint(decimalPoint)) {
            hasPoint = true;
        } else {
            break;
        }
    }
}

} // namespace

const char* FloatField::findEnd(const char* text, unsigned width,
                                const char* decimalPoint) noexcept {
    Cursor cursor(text, width);
    if (cursor.peek() == '-' || cursor.peek() == '+') {
        cursor.advance();
    }
    switch (lowerCase(cursor.peek())) {
    case 'n':
        return cursor.take("nan") ? cursor.position() : nullptr;
    case 'i':
        // Once begun, the long form must be complete: "infin" is not infinity.
        return cursor.take("inf") && (lowerCase(cursor.peek()) != 'i' || cursor.take("inity"))
                   ? cursor.position()
                   : nullptr;
    default:
        break;
    }
    const bool isHex = cursor.atHexPrefix();
    if (isHex) {
        cursor.advance(2);
    }
    const char* const start = cursor.position();
    takeNumber(cursor, isHex, decimalPoint);
    return cursor.position() != start ? cursor.position() : nullptr;
}

bool FloatField::convert(const char* begin, const char* end, Receiver receiver,
                         void* value) noexcept {
    // The C library converts terminated text. Only a number longer than any sensible one needs an
    // allocation.
    char usual[128];
    std::unique_ptr<char[]> large;
    char* text = usual;
    const auto length = static_cast<std::size_t>(end - begin);
    if (length >= sizeof usual) {
        large.reset(new (std::nothrow) char[length + 1]);
        if (!large) {
            return false;
        }
        text = large.get();
    }
    std::memcpy(text, begin, length);
    text[length] = '\0';

    char* behind = text;
    const auto store = [&](auto number) {
        if (value != nullptr && behind != text) {
            std::memcpy(value, &number, sizeof number);
        }
    };
    if (receiver == Receiver::FLOAT) {
        store(std::strtof(text, &behind));
    } else if (receiver == Receiver::DOUBLE) {
        store(std::strtod(text, &behind));
    } else {
        store(std::strtold(text, &behind));
    }
    return behind != text;
}

} // namespace zrm
