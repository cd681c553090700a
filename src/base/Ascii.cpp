#include "base/Ascii.h"

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace zrm {

namespace {

constexpr std::uint64_t highBits = 0x8080808080808080;
constexpr std::size_t wordSize = sizeof highBits;

std::uint64_t wordAt(const char* bytes) noexcept {
    std::uint64_t word;
    std::memcpy(&word, bytes, sizeof word);
    return word;
}

/// Four words as one, for bits that any of them may have. Separate words stay in registers.
std::uint64_t fourWordsAt(const char* bytes) noexcept {
    return wordAt(bytes) | wordAt(bytes + wordSize) | wordAt(bytes + 2 * wordSize) |
           wordAt(bytes + 3 * wordSize);
}

} // namespace

bool isAscii(std::string_view text) noexcept {
    constexpr std::size_t block = 4 * wordSize;
    const char* position = text.data();
    const char* const end = position + text.size();
    std::uint64_t seen = 0;
    for (; static_cast<std::size_t>(end - position) >= block; position += block) {
        seen |= fourWordsAt(position);
    }
    for (; static_cast<std::size_t>(end - position) >= wordSize; position += wordSize) {
        seen |= wordAt(position);
    }
    if (text.size() >= wordSize) {
        seen |= wordAt(end - wordSize); // the rest, including some bytes again
    } else {
        for (; position != end; ++position) {
            seen |= static_cast<unsigned char>(*position);
        }
    }
    return (seen & highBits) == 0;
}

} // namespace zrm
