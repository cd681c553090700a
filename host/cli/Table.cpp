#include "host/cli/Table.h"

#include "host/cli/DisplayText.h"

#include <algorithm>
#include <limits>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::size_t gap = 2;        ///< blanks between columns
constexpr std::size_t narrowest = 10; ///< the least width of a column that shrinks

} // namespace

Table::Table(std::vector<Column> columns) : m_columns(std::move(columns)) {}

void Table::add(std::vector<Cell> row) {
    for (Cell& cell : row) {
        cell.text = DisplayText::visible(cell.text);
    }
    m_rows.push_back(std::move(row));
}

std::vector<std::size_t> Table::widths(std::size_t available) const {
    std::vector<std::size_t> widths;
    std::size_t total = 0;
    for (std::size_t at = 0; at < m_columns.size(); ++at) {
        std::size_t widest = DisplayText::width(m_columns[at].heading);
        for (const auto& row : m_rows) {
            widest = std::max(widest, DisplayText::width(row[at].text));
        }
        widths.push_back(widest);
        total += widest + (at > 0 ? gap : 0);
    }
    while (available > 0 && total > available) {
        std::size_t widest = m_columns.size();
        for (std::size_t at = 0; at < m_columns.size(); ++at) {
            const bool shrinks = (m_columns[at].kind == TEXT || m_columns[at].kind == PATH) &&
                                 widths[at] > narrowest;
            if (shrinks && (widest == m_columns.size() || widths[at] > widths[widest])) {
                widest = at;
            }
        }
        if (widest == m_columns.size()) {
            break;
        }
        --widths[widest];
        --total;
    }
    return widths;
}

std::string Table::line(const std::vector<Cell>& row, const std::vector<std::size_t>& widths,
                        const Terminal& terminal) const {
    const std::size_t edge =
        terminal.width > 0 ? terminal.width : std::numeric_limits<std::size_t>::max();
    std::string result;
    std::size_t written = 0; // columns, without trailing blanks
    std::size_t begin = 0;   // of the cell
    for (std::size_t at = 0; at < row.size() && begin < edge; ++at) {
        const std::size_t width = std::min(widths[at], edge - begin);
        const auto shorten =
            m_columns[at].kind == PATH ? &DisplayText::shortenedPath : &DisplayText::shortened;
        const std::string shown = shorten(row[at].text, width, terminal.ellipsis());
        const std::size_t taken = DisplayText::width(shown);
        const std::size_t from = m_columns[at].kind == NUMBER ? begin + width - taken : begin;
        if (!shown.empty()) {
            result += std::string(from - written, ' ') + terminal.coloured(shown, row[at].colour);
            written = from + taken;
        }
        begin += width + gap;
    }
    return result + '\n';
}

std::string Table::text(const Terminal& terminal) const {
    const std::vector<std::size_t> columns = widths(terminal.width);
    std::vector<Cell> headings;
    for (const Column& column : m_columns) {
        headings.emplace_back(column.heading, Colour::HEADING);
    }
    std::string result = line(headings, columns, terminal);
    for (const auto& row : m_rows) {
        result += line(row, columns, terminal);
    }
    return result;
}

void FactList::add(std::string name, const std::string& value, Colour colour) {
    if (!value.empty()) {
        m_facts.push_back({std::move(name), DisplayText::visible(value), colour});
    }
}

std::string FactList::text(const Terminal& terminal) const {
    std::size_t widest = 0;
    for (const Fact& fact : m_facts) {
        widest = std::max(widest, fact.name.size());
    }
    std::string text;
    for (const Fact& fact : m_facts) {
        text += terminal.coloured(fact.name, Colour::FAINT) +
                std::string(widest - fact.name.size() + 2, ' ') +
                terminal.coloured(fact.value, fact.colour) + '\n';
    }
    return text;
}

} // namespace zrm::host
