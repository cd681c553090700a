#include "host/framework/ColumnText.h"

#include <algorithm>
#include <bit>
#include <cstdint>
#include <cstring>

#include <string.h>

namespace zrm::host {

namespace {

/// Most columns are mostly padding, so eight blanks are compared at a time.
constexpr std::uint64_t blanks = 0x2020202020202020;

std::uint64_t wordAt(const char* bytes) noexcept {
    std::uint64_t word;
    std::memcpy(&word, bytes, sizeof word);
    return word;
}

constexpr std::size_t block = 4 * sizeof blanks;

bool isBlankBlock(const char* bytes) noexcept {
    std::uint64_t words[4];
    std::memcpy(words, bytes, sizeof words);
    return ((words[0] ^ blanks) | (words[1] ^ blanks) | (words[2] ^ blanks) |
            (words[3] ^ blanks)) == 0;
}

/// The number of blanks with which eight bytes end that are not all blank; `others` has zeros where
/// there is a blank.
std::size_t blanksAtEnd(std::uint64_t others) noexcept {
    const int bits = std::endian::native == std::endian::little ? std::countl_zero(others)
                                                                : std::countr_zero(others);
    return static_cast<std::size_t>(bits) / 8;
}

/// Difference of the text's first byte that is not a blank from a blank; 0 when there is none.
int compareWithBlanks(std::string_view text) noexcept {
    const std::size_t position = text.find_first_not_of(' ');
    return position == std::string_view::npos ? 0
                                              : static_cast<unsigned char>(text[position]) - ' ';
}

} // namespace

std::string_view ColumnText::withoutTrailingBlanks(std::string_view text) noexcept {
    std::size_t size = text.size();
    while (size >= block && isBlankBlock(text.data() + size - block)) {
        size -= block;
    }
    while (size >= sizeof blanks) {
        const std::uint64_t others = wordAt(text.data() + size - sizeof blanks) ^ blanks;
        if (others != 0) {
            return text.substr(0, size - blanksAtEnd(others));
        }
        size -= sizeof blanks;
    }
    while (size > 0 && text[size - 1] == ' ') {
        --size;
    }
    return text.substr(0, size);
}

std::string_view ColumnText::unpadded(const char* field, std::size_t width) noexcept {
    return withoutTrailingBlanks({field, strnlen(field, width)});
}

bool ColumnText::isPadding(const char* rest, std::size_t width) noexcept {
    std::size_t position = 0;
    while (position + block <= width && isBlankBlock(rest + position)) {
        position += block;
    }
    while (position + sizeof blanks <= width && wordAt(rest + position) == blanks) {
        position += sizeof blanks;
    }
    while (position < width && rest[position] == ' ') {
        ++position;
    }
    return position == width || rest[position] == '\0';
}

int ColumnText::compare(const char* field, std::size_t width, std::string_view value) noexcept {
    const std::string_view text(field, strnlen(field, width));
    const std::size_t common = std::min(text.size(), value.size());
    if (const int order = std::memcmp(text.data(), value.data(), common)) {
        return order;
    }
    return compareWithBlanks(text.substr(common)) - compareWithBlanks(value.substr(common));
}

} // namespace zrm::host
