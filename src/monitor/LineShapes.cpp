#include "monitor/LineShapes.h"

#include <algorithm>
#include <new>

namespace zrm {

namespace {

constexpr bool isDigit(char c) noexcept {
    return c >= '0' && c <= '9';
}

/// Bytes beyond ASCII are parts of words.
constexpr bool isLetter(char c) noexcept {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
           static_cast<unsigned char>(c) >= 0x80;
}

constexpr char markOf(char c) noexcept {
    if (isDigit(c)) {
        return '9';
    }
    if (isLetter(c)) {
        return 'a';
    }
    return static_cast<unsigned char>(c) < ' ' || c == '\x7f' ? ' ' : c;
}

/// Whether the marks of several such characters become one.
constexpr bool isJoined(char mark) noexcept {
    return mark == '9' || mark == 'a' || mark == ' ';
}

/// Writes the shape of a line, and returns its length.
std::size_t write(std::string_view line, char* out) noexcept {
    std::size_t length = 0;
    for (const char c : line) {
        const char mark = markOf(c);
        if (length > 0 && isJoined(mark) && out[length - 1] == mark) {
            continue;
        }
        if (length == LineShapes::longest) {
            break;
        }
        out[length++] = mark;
    }
    return length;
}

} // namespace

LineShapes::Slot* LineShapes::slotOf(std::string_view shape) noexcept {
    Slot* const end = m_slots.get() + m_used;
    Slot* const found = std::find_if(
        m_slots.get(), end, [shape](const Slot& slot) { return slot.shape.view() == shape; });
    if (found != end) {
        return found;
    }
    Slot* slot = end;
    if (m_used < mostKept) {
        ++m_used;
        slot->shape.count = 0;
    } else {
        // The newcomer takes over the count of the rarest one: whatever is frequent enough stays.
        slot = std::min_element(m_slots.get(), end, [](const Slot& one, const Slot& other) {
            return one.shape.count < other.shape.count;
        });
    }
    slot->before = slot->shape.count;
    slot->shape.length = shape.copy(slot->shape.text, longest);
    return slot;
}

void LineShapes::note(std::string_view line) noexcept {
    if (!m_slots) {
        m_slots.reset(new (std::nothrow) Slot[mostKept]);
    }
    if (m_slots) {
        char text[longest];
        ++slotOf({text, write(line, text)})->shape.count;
    }
}

std::size_t LineShapes::copy(Shape* out) const noexcept {
    for (std::size_t i = 0; i < m_used; ++i) {
        out[i] = m_slots[i].shape;
        out[i].count -= m_slots[i].before;
    }
    std::sort(out, out + m_used,
              [](const Shape& one, const Shape& other) { return one.count > other.count; });
    return m_used;
}

} // namespace zrm
