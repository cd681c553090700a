#ifndef ZRM_HOST_CLI_TABLE_H
#define ZRM_HOST_CLI_TABLE_H

#include "host/cli/Terminal.h"

#include <cstddef>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm::host {

/// Rows of text under headings, fitted to a terminal: columns that may shrink are shortened, the
/// widest first, and what still does not fit is cut off at the edge.
class Table {
public:
    enum class Kind {
        FIXED,  ///< keeps its width as long as it can
        NUMBER, ///< the same, right-aligned
        TEXT,   ///< shrinks
        PATH,   ///< shrinks at its beginning, since file names differ at the end
    };
    using enum Kind;
    struct Column {
        std::string heading;
        Kind kind = TEXT;
    };
    struct Cell {
        // A plain text is a cell. NOLINTNEXTLINE(google-explicit-constructor)
        Cell(std::string cellText, Colour cellColour = Colour::NONE)
            : text(std::move(cellText)), colour(cellColour) {}
        std::string text; ///< as received; shown in visible form
        Colour colour;
    };

    explicit Table(std::vector<Column> columns);

    /// Adds a row with a cell for each column.
    void add(std::vector<Cell> row);
    bool empty() const noexcept { return m_rows.empty(); }
    std::size_t size() const noexcept { return m_rows.size(); }

    /// The headings and the rows, each with its line end.
    std::string text(const Terminal& terminal) const;

private:
    std::vector<std::size_t> widths(std::size_t available) const;
    std::string line(const std::vector<Cell>& row, const std::vector<std::size_t>& widths,
                     const Terminal& terminal) const;

    std::vector<Column> m_columns;
    std::vector<std::vector<Cell>> m_rows;
};

/// A list of names and values, one per line.
class FactList {
public:
    /// Adds a fact; a fact with an empty value is left out.
    void add(std::string name, const std::string& value, Colour colour = Colour::NONE);

    /// The lines; values are never shortened to the terminal's width.
    std::string text(const Terminal& terminal) const;

private:
    struct Fact {
        std::string name;
        std::string value;
        Colour colour;
    };
    std::vector<Fact> m_facts;
};

} // namespace zrm::host

#endif
