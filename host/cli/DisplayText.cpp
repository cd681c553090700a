#include "host/cli/DisplayText.h"

#include "host/base/Utf8.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <cwchar>

#include <locale.h>

namespace zrm::host {

namespace {

struct Range {
    char32_t first;
    char32_t last;
};

/// Zero-width characters, which could hide other text.
constexpr std::array<Range, 4> invisible = {
    {{0x200b, 0x200f}, {0x2060, 0x2065}, {0x206a, 0x206f}, {0xfeff, 0xfeff}}};

bool isHidden(char32_t character) {
    return Utf8::isSteering(character) ||
           std::any_of(invisible.begin(), invisible.end(), [&](const Range& range) {
               return character >= range.first && character <= range.last;
           });
}

std::string escaped(char32_t character) {
    switch (character) {
    case '\n':
        return "\\n";
    case '\r':
        return "\\r";
    case '\t':
        return "\\t";
    default:
        char text[16];
        std::snprintf(text, sizeof text, character < 0x80 ? "\\x%02x" : "\\u%04x",
                      static_cast<unsigned>(character));
        return text;
    }
}

/// While it exists, this thread uses the C library's UTF-8 locale for character widths, whatever
/// the operator's locale is.
class Utf8Locale {
public:
    Utf8Locale() : m_before(uselocale(utf8())) {}
    ~Utf8Locale() { uselocale(m_before); }
    Utf8Locale(const Utf8Locale&) = delete;
    Utf8Locale& operator=(const Utf8Locale&) = delete;

private:
    static locale_t utf8() {
        static const locale_t locale = newlocale(LC_CTYPE_MASK, "C.UTF-8", nullptr);
        return locale;
    }
    locale_t m_before;
};

std::size_t columnsOf(std::string_view sequence) {
    const char32_t character = Utf8::character(sequence);
    if (character < 0x80) {
        return 1;
    }
    const int columns = wcwidth(static_cast<wchar_t>(character));
    return columns < 0 ? 1 : static_cast<std::size_t>(columns); // unassigned: shown as a box
}

} // namespace

std::string DisplayText::visible(std::string_view text) {
    std::string result;
    result.reserve(text.size());
    while (!text.empty()) {
        const Utf8::Sequence sequence = Utf8::firstSequence(text);
        const std::string_view bytes = text.substr(0, sequence.length);
        if (!sequence.valid) {
            result += Utf8::replacement;
        } else if (const char32_t character = Utf8::character(bytes); isHidden(character)) {
            result += escaped(character);
        } else {
            result += bytes;
        }
        text.remove_prefix(sequence.length);
    }
    return result;
}

std::size_t DisplayText::width(std::string_view visible) {
    if (Utf8::asciiPrefix(visible) == visible.size()) {
        return visible.size();
    }
    const Utf8Locale locale;
    std::size_t columns = 0;
    while (!visible.empty()) {
        const std::size_t length = Utf8::firstSequence(visible).length;
        columns += columnsOf(visible.substr(0, length));
        visible.remove_prefix(length);
    }
    return columns;
}

std::string_view DisplayText::beginning(std::string_view visible, std::size_t columns) {
    const Utf8Locale locale;
    std::size_t end = 0;
    while (end < visible.size()) {
        const std::size_t length = Utf8::firstSequence(visible.substr(end)).length;
        const std::size_t more = columnsOf(visible.substr(end, length));
        if (more > columns) {
            break;
        }
        columns -= more;
        end += length;
    }
    return visible.substr(0, end);
}

namespace {

/// The text if it fits the columns; otherwise what `cut` leaves of it beside the ellipsis.
template <class Cut>
std::string fitted(std::string_view visible, std::size_t columns, std::string_view ellipsis,
                   Cut cut) {
    if (DisplayText::width(visible) <= columns) {
        return std::string(visible);
    }
    const std::size_t mark = DisplayText::width(ellipsis);
    if (mark >= columns) {
        return std::string(DisplayText::beginning(ellipsis, columns));
    }
    return cut(columns - mark);
}

} // namespace

std::string DisplayText::shortened(std::string_view visible, std::size_t columns,
                                   std::string_view ellipsis) {
    return fitted(visible, columns, ellipsis, [&](std::size_t room) {
        return std::string(beginning(visible, room)) + std::string(ellipsis);
    });
}

std::string DisplayText::shortenedPath(std::string_view visible, std::size_t columns,
                                       std::string_view ellipsis) {
    return fitted(visible, columns, ellipsis, [&](std::size_t room) {
        const Utf8Locale locale;
        while (width(visible) > room) {
            visible.remove_prefix(Utf8::firstSequence(visible).length);
        }
        return std::string(ellipsis) + std::string(visible);
    });
}

} // namespace zrm::host
