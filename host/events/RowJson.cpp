#include "host/events/RowJson.h"

#include "host/base/SteeringText.h"
#include "host/base/Utf8.h"
#include "host/events/RowText.h"

#include <array>
#include <charconv>
#include <cstdint>
#include <cstring>

namespace zrm::host {

namespace {

constexpr std::uint64_t each = 0x0101010101010101;
constexpr std::uint64_t highBits = each * 0x80;

/// True when a byte of the word is less than `limit`, which is at most 128.
constexpr bool hasByteBelow(std::uint64_t word, unsigned limit) {
    return ((word - each * limit) & ~word & highBits) != 0;
}

constexpr bool hasByte(std::uint64_t word, char c) {
    return hasByteBelow(word ^ (each * static_cast<unsigned char>(c)), 1);
}

/// True for eight bytes of ASCII that need no escape in a JSON string.
bool isPlain(std::uint64_t word) {
    return (word & highBits) == 0 && !hasByteBelow(word, ' ') && !hasByte(word, '"') &&
           !hasByte(word, '\\');
}

bool isPlain(char c) {
    const auto byte = static_cast<unsigned char>(c);
    return byte >= ' ' && byte < 0x80 && c != '"' && c != '\\';
}

/// Length of the leading part that needs no escape.
std::size_t plainPrefix(std::string_view text) {
    std::size_t position = 0;
    std::uint64_t word;
    while (position + sizeof word <= text.size()) {
        std::memcpy(&word, text.data() + position, sizeof word);
        if (!isPlain(word)) {
            break;
        }
        position += sizeof word;
    }
    while (position < text.size() && isPlain(text[position])) {
        ++position;
    }
    return position;
}

/// Escapes the control characters, the quote and the backslash; numerically if they have no short
/// form.
void appendEscaped(std::string& out, char c) {
    constexpr std::string_view shortText = "\"\\\b\f\n\r\t";
    constexpr std::string_view letters = "\"\\bfnrt";
    constexpr char hexDigits[] = "0123456789abcdef";
    const std::size_t index = shortText.find(c);
    if (index != std::string_view::npos) {
        out += '\\';
        out += letters[index];
    } else {
        const auto byte = static_cast<unsigned char>(c);
        out += "\\u00";
        out += hexDigits[byte >> 4];
        out += hexDigits[byte & 15];
    }
}

/// Appends a non-ASCII character.
void appendCharacter(std::string& out, std::string_view sequence) {
    if (const char32_t character = Utf8::character(sequence); Utf8::isSteering(character)) {
        SteeringText::appendEscape(out, character);
    } else {
        out += sequence;
    }
}

/// Removes the first sequence, which needs an escape or is not ASCII, from the text.
void appendSpecial(std::string& out, std::string_view& text) {
    const Utf8::Sequence sequence = Utf8::firstSequence(text);
    if (!sequence.valid) {
        out += Utf8::replacement;
    } else if (sequence.length > 1) {
        appendCharacter(out, text.substr(0, sequence.length));
    } else {
        appendEscaped(out, text.front());
    }
    text.remove_prefix(sequence.length);
}

void appendInteger(std::string& out, std::int32_t value) {
    std::array<char, 12> digits;
    const auto result = std::to_chars(digits.data(), digits.data() + digits.size(), value);
    out.append(digits.data(), result.ptr);
}

} // namespace

void RowJson::appendText(std::string& out, std::string_view text) {
    out += '"';
    while (!text.empty()) {
        const std::size_t plain = plainPrefix(text);
        out += text.substr(0, plain);
        text.remove_prefix(plain);
        if (!text.empty()) {
            appendSpecial(out, text);
        }
    }
    out += '"';
}

void RowJson::append(std::string& out, const RowLayout& layout, const char* row) {
    std::string room;
    char separator = '{';
    for (const RowColumn& column : layout.columns()) {
        out += separator;
        out += '"';
        out += column.name;
        out += "\":";
        if (column.isInteger()) {
            appendInteger(out, column.integer(row));
        } else {
            appendText(out, RowText::of(column, row, room));
        }
        separator = ',';
    }
    out += layout.columns().empty() ? "{}" : "}";
}

} // namespace zrm::host
