#ifndef ZRM_ENTRY_FIELDS_H
#define ZRM_ENTRY_FIELDS_H

#include <cstddef>
#include <memory>
#include <optional>
#include <span>
#include <string_view>
#include <vector>

namespace zrm {

/// The fields of one entry: flat names and text values. Reused from entry to entry; after the first
/// entries it allocates nothing. Names and values are views into the entry's text or into memory of
/// the object, valid until clear(). Bounded in number and bytes, whatever an entry contains. One
/// thread.
class EntryFields {
public:
    struct Field {
        std::string_view name;
        std::string_view value;
    };

    static constexpr std::size_t most = 256;        ///< fields of an entry
    static constexpr std::size_t longestName = 255; ///< bytes
    static constexpr std::size_t room = 64 * 1024;  ///< bytes for texts that are built

    /// Forgets all fields.
    void clear() noexcept;

    /// Adds a field. Both texts must stay valid until clear(). Of several fields of one name the
    /// first counts. A field without a name, with too long a name, or beyond the most, to which all
    /// that were added count, is left out.
    void add(std::string_view name, std::string_view value) noexcept;
    /// The same for each of these, whose names are neither empty nor too long.
    void add(std::span<const Field> fields) noexcept;

    /// Appends to a text that is built in the object's memory.
    EntryFields& append(std::string_view part) noexcept;
    /// Ends that text. None if there was no room for all of it.
    std::optional<std::string_view> takeText() noexcept;

    /// The value of the field with this name; null if the entry has none.
    const std::string_view* find(std::string_view name) const noexcept;

    /// All fields in the order of the entry.
    std::span<const Field> all() const noexcept;

    /// How many fields were left out because there was no room for them.
    std::size_t leftOut() const noexcept { return m_leftOut; }
    /// Counts a field that could not be added.
    void noteLeftOut() noexcept { ++m_leftOut; }

private:
    /// False if there is no memory for the fields.
    bool hasPlaces() noexcept { return m_fields.capacity() >= most || reserve(); }
    bool reserve() noexcept;

    // Fields whose name has been are looked for only when all fields are asked for, as for few
    // entries.
    mutable std::vector<Field> m_fields;
    mutable bool m_mayRepeat = false; ///< of several fields of one name all may be here
    std::unique_ptr<char[]> m_texts;  ///< `room` bytes, once a text was built
    std::size_t m_used = 0;           ///< bytes, also of the text that is being built
    std::size_t m_textBegin = 0;      ///< of the text that is being built
    bool m_hasRoom = true;            ///< for the text that is being built
    std::size_t m_leftOut = 0;
};

} // namespace zrm

#endif
