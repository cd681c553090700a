#include "host/base/Utf8.h"

#include <cstdint>
#include <cstring>

namespace zrm::host {

namespace {

constexpr std::uint64_t highBits = 0x8080808080808080;

/// The form of characters that begin with one of these bytes: the range of the second byte excludes
/// overlong forms, surrogates and values beyond the last character.
struct Form {
    unsigned char first;
    unsigned char last;
    unsigned char length;
    unsigned char secondFirst;
    unsigned char secondLast;
};

constexpr Form forms[] = {
    {0xC2, 0xDF, 2, 0x80, 0xBF}, {0xE0, 0xE0, 3, 0xA0, 0xBF}, {0xE1, 0xEC, 3, 0x80, 0xBF},
    {0xED, 0xED, 3, 0x80, 0x9F}, {0xEE, 0xEF, 3, 0x80, 0xBF}, {0xF0, 0xF0, 4, 0x90, 0xBF},
    {0xF1, 0xF3, 4, 0x80, 0xBF}, {0xF4, 0xF4, 4, 0x80, 0x8F},
};

std::uint64_t wordAt(const char* bytes) {
    std::uint64_t word;
    std::memcpy(&word, bytes, sizeof word);
    return word;
}

/// Four words as one, for bits that any of them may have. Separate words stay in registers.
std::uint64_t fourWordsAt(const char* bytes) {
    constexpr std::size_t size = sizeof(std::uint64_t);
    return wordAt(bytes) | wordAt(bytes + size) | wordAt(bytes + 2 * size) |
           wordAt(bytes + 3 * size);
}

bool isContinuation(unsigned char byte) {
    return (byte & 0xC0) == 0x80;
}

} // namespace

std::size_t Utf8::asciiPrefix(std::string_view text) noexcept {
    std::size_t position = 0;
    constexpr std::size_t block = 4 * sizeof highBits;
    for (; position + block <= text.size(); position += block) {
        if ((fourWordsAt(text.data() + position) & highBits) != 0) {
            break;
        }
    }
    while (position + sizeof highBits <= text.size() &&
           (wordAt(text.data() + position) & highBits) == 0) {
        position += sizeof highBits;
    }
    while (position < text.size() && static_cast<unsigned char>(text[position]) < 0x80) {
        ++position;
    }
    return position;
}

Utf8::Sequence Utf8::firstSequence(std::string_view text) noexcept {
    const auto byteAt = [text](std::size_t index) {
        return static_cast<unsigned char>(text[index]);
    };
    const unsigned char lead = byteAt(0);
    if (lead < 0x80) {
        return {1, true};
    }
    for (const Form& form : forms) {
        if (lead < form.first || lead > form.last) {
            continue;
        }
        if (text.size() < 2 || byteAt(1) < form.secondFirst || byteAt(1) > form.secondLast) {
            return {1, false};
        }
        std::size_t length = 2;
        while (length < form.length && length < text.size() && isContinuation(byteAt(length))) {
            ++length;
        }
        return {length, length == form.length};
    }
    return {1, false};
}

std::size_t Utf8::validPrefix(std::string_view text) noexcept {
    std::size_t position = 0;
    for (;;) {
        position += asciiPrefix(text.substr(position));
        if (position == text.size()) {
            return position;
        }
        const Sequence sequence = firstSequence(text.substr(position));
        if (!sequence.valid) {
            return position;
        }
        position += sequence.length;
    }
}

char32_t Utf8::character(std::string_view sequence) noexcept {
    const auto first = static_cast<unsigned char>(sequence[0]);
    if (sequence.size() == 1) {
        return first;
    }
    char32_t character = first & (0x7fu >> sequence.size());
    for (const char next : sequence.substr(1)) {
        character = (character << 6) | (static_cast<unsigned char>(next) & 0x3fu);
    }
    return character;
}

bool Utf8::isSteering(char32_t character) noexcept {
    const auto isBetween = [character](char32_t first, char32_t last) {
        return character >= first && character <= last;
    };
    return character < 0x20 || isBetween(0x7f, 0x9f) || character == 0x061c ||
           isBetween(0x200e, 0x200f) || isBetween(0x2028, 0x202e) || isBetween(0x2066, 0x2069);
}

std::string_view Utf8::prefix(std::string_view text, std::size_t size) noexcept {
    if (size >= text.size()) {
        return text;
    }
    // A character has at most three bytes after its first; more do not belong to any character.
    for (std::size_t back = 0; back < 4 && back < size + 1; ++back) {
        if (!isContinuation(static_cast<unsigned char>(text[size - back]))) {
            return text.substr(0, size - back);
        }
    }
    return text.substr(0, size);
}

} // namespace zrm::host
