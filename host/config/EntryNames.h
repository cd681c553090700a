#ifndef ZRM_HOST_ENTRY_NAMES_H
#define ZRM_HOST_ENTRY_NAMES_H

#include "host/base/Result.h"
#include "host/framework/Condition.h"

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// What a name stands for in an entry that meets the conditions of a situation.
struct EntryName {
    enum class Kind : unsigned char { column, field, capture };

    Kind kind = Kind::column;
    std::size_t column = 0;    ///< of a column: its place in the table Log Entries
    std::string field = {};    ///< of a field: its name
    std::size_t condition = 0; ///< of a capture: index of the condition whose pattern has it
    int group = 0;             ///< of a capture: its number in that pattern
};

/// The names that may stand for the values of an entry where a situation says what to do with it:
/// the named captures of its `matches` conditions, the columns, and the fields. Immutable.
class EntryNames {
public:
    /// The conditions are those of one situation; patterns that cannot be used have no captures.
    explicit EntryNames(const std::vector<Condition>& conditions);

    /// What a name means: a capture (of the first condition that has one of this name), a column in
    /// upper or lower case, or a field that a condition names; "field.NAME" is any field. The
    /// problem of an unknown name has no field, and names those that are known.
    Result<EntryName> find(std::string_view name) const;

    /// The column or field of a condition.
    static EntryName sourceOf(const Condition& condition);

private:
    struct Capture {
        std::string name;
        std::size_t condition;
        int group;
    };

    void addCaptures(std::size_t index, const Condition& condition);
    void addField(std::string_view field);
    std::string known() const;

    std::vector<Capture> m_captures;   ///< each name once
    std::vector<std::string> m_fields; ///< that the conditions name, each once
};

} // namespace zrm::host

#endif
