#ifndef ZRM_HOST_FIELDS_JSON_H
#define ZRM_HOST_FIELDS_JSON_H

#include <cstddef>
#include <limits>
#include <string>
#include <vector>

namespace zrm {
class EntryFields;
} // namespace zrm

namespace zrm::host {

/// Fields of an entry as JSON.
struct FieldsJson {
    /// Instead of a list of names: all fields.
    static constexpr const char* all = "*";
    static constexpr std::size_t unlimited = std::numeric_limits<std::size_t>::max();

    /// The fields that have one of these names, in the order of the entry. With `mostBytes`, names
    /// and values have at most so many bytes in all: a longer value is cut at a character, and what
    /// comes after it is left out.
    static FieldsJson of(const EntryFields& fields, const std::vector<std::string>& names,
                         std::size_t mostBytes = unlimited);

    std::string text;   ///< an object; empty if the entry has none of the fields
    bool isCut = false; ///< a value is cut, or fields that were asked for are left out
};

} // namespace zrm::host

#endif
