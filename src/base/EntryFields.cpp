#include "base/EntryFields.h"

#include <algorithm>
#include <new>
#include <utility>

namespace zrm {

void EntryFields::clear() noexcept {
    m_fields.clear();
    m_marks.reset();
    m_used = m_textBegin = 0;
    m_hasRoom = true;
    m_leftOut = 0;
}

/// Makes room for all fields at once. False if there is no memory.
bool EntryFields::reserve() noexcept {
    try {
        m_fields.reserve(most);
        return true;
    } catch (const std::bad_alloc&) {
        return false;
    }
}

void EntryFields::add(std::string_view name, std::string_view value) noexcept {
    if (hasPlaces()) {
        place({name, value});
    } else {
        noteLeftOut();
    }
}

void EntryFields::add(std::span<const Field> fields) noexcept {
    if (!hasPlaces()) {
        m_leftOut += fields.size();
        return;
    }
    for (const Field& field : fields) {
        place(field);
    }
}

/// There is memory for it.
inline void EntryFields::place(const Field& field) noexcept {
    if (field.name.empty() || field.name.size() > longestName || m_fields.size() == most) {
        noteLeftOut();
        return;
    }
    const std::size_t mark = markOf(field.name);
    if (!m_marks[mark] || search(field.name) == nullptr) {
        m_marks.set(mark);
        m_fields.push_back(field);
    }
}

EntryFields& EntryFields::append(std::string_view part) noexcept {
    if (!m_texts) {
        m_texts.reset(new (std::nothrow) char[room]);
    }
    m_hasRoom = m_hasRoom && m_texts && part.size() <= room - m_used;
    if (m_hasRoom) {
        m_used += part.copy(m_texts.get() + m_used, part.size());
    }
    return *this;
}

std::optional<std::string_view> EntryFields::takeText() noexcept {
    std::optional<std::string_view> text;
    if (std::exchange(m_hasRoom, true)) {
        text.emplace(m_texts.get() + m_textBegin, m_used - m_textBegin);
    } else {
        m_used = m_textBegin;
    }
    m_textBegin = m_used;
    return text;
}

std::size_t EntryFields::markOf(std::string_view name) noexcept {
    const auto byte = [name](std::size_t at) {
        return std::size_t{static_cast<unsigned char>(name[at])};
    };
    return (name.size() * 41 + byte(0) * 7 + byte(name.size() - 1)) % 256;
}

const std::string_view* EntryFields::find(std::string_view name) const noexcept {
    return name.empty() || !m_marks[markOf(name)] ? nullptr : search(name);
}

const std::string_view* EntryFields::search(std::string_view name) const noexcept {
    const auto found = std::find_if(m_fields.begin(), m_fields.end(),
                                    [name](const Field& field) { return field.name == name; });
    return found == m_fields.end() ? nullptr : &found->value;
}

} // namespace zrm
