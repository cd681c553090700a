#ifndef ZRM_HOST_FLAT_JSON_H
#define ZRM_HOST_FLAT_JSON_H

#include "base/EntryFields.h"
#include "host/formats/JsonNames.h"
#include "host/formats/JsonScan.h"

#include <cstddef>
#include <memory>
#include <string_view>

namespace zrm::host {

/// Takes JSON objects apart into flat fields. Reused from one to the next: keeps memory for the
/// longest text it has seen, and allocates nothing once it has that. One thread.
///
/// The members of a nested object have its name before theirs, with a dot, and the elements of an
/// array their number ("tags.0"). What is nested deeper than `deepest` is one field with the JSON
/// text. Texts are without their escapes; numbers, true and false are as they are written; a null
/// is not a field, nor is an empty object or array.
class FlatJson {
public:
    static constexpr unsigned deepest = 16;

    /// The names outlive the object. Throws std::bad_alloc.
    explicit FlatJson(const JsonNames& names);
    FlatJson(const FlatJson&) = delete;
    FlatJson& operator=(const FlatJson&) = delete;

    /// Reads an object. False if the text is anything but one complete JSON object: reason() says
    /// why.
    bool read(std::string_view text) noexcept;
    /// A clause. Valid until the next read.
    std::string_view reason() const noexcept { return {m_reason, m_reasonLength}; }
    /// What the object has for the columns. Views into memory of this object, until the next read.
    const JsonColumns& columns() const noexcept { return m_columns; }
    /// True if this is the text that was read last.
    bool isOf(std::string_view text) const noexcept;
    /// Adds the fields of the object that was read last. Names and values are views into memory of
    /// this object, until the next read.
    void addTo(EntryFields& fields) const noexcept;

private:
    class Walk;
    class Below;

    void keep(std::string_view name, std::string_view value, bool isNumber) noexcept;
    void keepSpecial(bool isNumber) noexcept;
    /// The name with those of what it is in. Without data if that is too long.
    std::string_view fullName(std::string_view name) noexcept {
        return m_pathLength == 0 ? name : nestedName(name);
    }
    std::string_view nestedName(std::string_view name) noexcept;
    std::string_view built(std::string_view name) noexcept;
    bool refuse(std::string_view reason) noexcept;
    bool refuse(std::string_view reason, std::size_t place) noexcept;

    const JsonNames& m_names;
    JsonScan m_scan;
    JsonColumns m_columns;
    bool m_isRead = false; ///< the text was an object
    /// Views into memory of m_scan, or into m_built. With room for one more.
    const std::unique_ptr<EntryFields::Field[]> m_fields;
    std::size_t m_count = 0;
    std::size_t m_members = 0;       ///< more than the fields if some were left out
    std::unique_ptr<char[]> m_built; ///< names of nested fields
    std::size_t m_builtSize = 0;
    char m_path[EntryFields::longestName]{}; ///< the name of what is walked, with a dot behind it
    std::size_t m_pathLength = 0;            ///< more than m_path has: names are too long
    char m_reason[128]{};
    std::size_t m_reasonLength = 0;
};

} // namespace zrm::host

#endif
