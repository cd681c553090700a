#include "host/framework/ColumnText.h"

#include <algorithm>
#include <cstdint>
#include <cstring>

#include <string.h>

namespace {

/// Most columns are mostly padding, so eight blanks are taken at a time.
constexpr std::uint64_t kBlanks = 0x2020202020202020;

std::uint64_t wordAt(const char* bytes) noexcept {
    std::uint64_t word;
    std::memcpy(&word, bytes, sizeof word);
    return word;
}

constexpr std::size_t kBlock = 4 * sizeof kBlanks;

bool isBlankBlock(const char* bytes) noexcept {
    std::uint64_t words[4];
    std::memcpy(words, bytes, sizeof words);
    return ((words[0] ^ kBlanks) | (words[1] ^ kBlanks) | (words[2] ^ kBlanks) |
            (words[3] ^ kBlanks)) == 0;
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
    while (size >= kBlock && isBlankBlock(text.data() + size - kBlock)) {
        size -= kBlock;
    }
    while (size >= sizeof kBlanks && wordAt(text.data() + size - sizeof kBlanks) == kBlanks) {
        size -= sizeof kBlanks;
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
    while (position + kBlock <= width && isBlankBlock(rest + position)) {
        position += kBlock;
    }
    while (position + sizeof kBlanks <= width && wordAt(rest + position) == kBlanks) {
        position += sizeof kBlanks;
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
