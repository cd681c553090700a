#include "base/EntryFields.h"

#include <algorithm>
#include <bitset>
#include <cstdint>
#include <new>
#include <utility>

namespace zrm {

namespace {

/// A number that stands for names of this length, beginning and end.
std::uint8_t markOf(std::string_view name) noexcept {
    return static_cast<std::uint8_t>(name.size() * 41 +
                                     static_cast<unsigned char>(name.front()) * 7 +
                                     static_cast<unsigned char>(name.back()));
}

const EntryFields::Field* search(std::span<const EntryFields::Field> fields,
                                 std::string_view name) noexcept {
    const auto found = std::find_if(fields.begin(), fields.end(),
                                    [name](const auto& field) { return field.name == name; });
    return found == fields.end() ? nullptr : &*found;
}

} // namespace

void EntryFields::clear() noexcept {
    m_fields.clear();
    m_mayRepeat = false;
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
    if (name.empty() || name.size() > longestName) {
        noteLeftOut();
        return;
    }
    const Field field{name, value};
    add(std::span(&field, 1));
}

void EntryFields::add(std::span<const Field> fields) noexcept {
    const std::size_t room = hasPlaces() ? most - m_fields.size() : 0;
    const auto taken = fields.first(std::min(fields.size(), room));
    m_fields.insert(m_fields.end(), taken.begin(), taken.end());
    m_mayRepeat = true;
    m_leftOut += fields.size() - taken.size();
}

std::span<const EntryFields::Field> EntryFields::all() const noexcept {
    if (std::exchange(m_mayRepeat, false)) {
        std::bitset<256> marks; // of a name without one it is known that it has not been
        std::size_t count = 0;
        for (const Field& field : m_fields) {
            const std::uint8_t mark = markOf(field.name);
            if (!marks[mark] || search({m_fields.data(), count}, field.name) == nullptr) {
                marks.set(mark);
                m_fields[count++] = field;
            }
        }
        m_fields.resize(count);
    }
    return m_fields;
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

const std::string_view* EntryFields::find(std::string_view name) const noexcept {
    const Field* const field = search(m_fields, name);
    return field == nullptr ? nullptr : &field->value;
}

} // namespace zrm
