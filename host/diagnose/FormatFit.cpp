#include "host/diagnose/FormatFit.h"

#include "base/EntryFields.h"
#include "host/diagnose/LineWords.h"
#include "host/formats/EntryColumn.h"

#include <algorithm>
#include <memory>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

double partOf(std::size_t part, std::size_t whole) noexcept {
    return whole == 0 ? 0 : static_cast<double>(part) / static_cast<double>(whole);
}

/// A line that obviously goes on with what the one before it says.
bool isFurther(std::string_view line) noexcept {
    return line.empty() || line.front() == ' ' || line.front() == '\t';
}

/// Whether a word may be the name of a host: a level or a word in brackets, for example, is none.
bool isHost(std::string_view word) noexcept {
    const bool isLetter = word.size() == 1 && word[0] >= 'A' && word[0] <= 'Z';
    return !isLevelName(word) && !isLetter && !word.ends_with(':') &&
           std::all_of(word.begin(), word.end(), [](char c) {
               constexpr std::string_view others = ".-_:%,";
               return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
                      others.find(c) != std::string_view::npos ||
                      static_cast<unsigned char>(c) > 0x7f;
           });
}

class Fitting {
public:
    Fitting(const FormatDescription& description, std::shared_ptr<const EntryFormat> format,
            std::shared_ptr<const LineJoin> join)
        : m_description(description), m_format(std::move(format)), m_join(std::move(join)),
          m_reader(m_format->reader()) {
        m_fit.namesProgram = description.defaults.contains("source");
    }

    FormatFit run(const std::vector<std::string>& lines) {
        for (const std::string& line : lines) {
            ++m_fit.lines;
            const bool continues =
                m_previous != nullptr && hasRoom() && m_join->joins(*m_previous, line);
            if (!continues) {
                endEntry();
            }
            addLine(line, continues);
            m_previous = &line;
        }
        endEntry();
        // A join that swallows most lines is not evidence that they fit.
        if (m_begun * 2 >= m_plain) {
            m_fit.fitting += m_swallowed;
        }
        return m_fit;
    }

private:
    bool hasRoom() const {
        return m_join && m_lines < m_join->limits().lines &&
               m_entry.size() < m_join->limits().bytes;
    }

    void addLine(const std::string& line, bool continues) {
        m_entry += (m_lines++ == 0 ? "" : "\n") + line;
        if (!continues) {
            ++m_begun;
        }
        if (!isFurther(line)) {
            ++m_plain;
            m_plainOfEntry += continues ? 1 : 0;
        }
    }

    void endEntry() {
        if (m_lines > 0) {
            judge();
        }
        m_entry.clear();
        m_lines = 0;
        m_plainOfEntry = 0;
    }

    void judge() {
        EntryColumns columns;
        if (!m_reader->read(m_entry, columns) || !FormatFit::fits(m_description, columns)) {
            return;
        }
        ++m_fit.entries;
        m_fit.fitting += m_lines - m_plainOfEntry;
        m_swallowed += m_plainOfEntry;
        m_fit.withTime += columns.hasTime ? 1 : 0;
        const bool hasType = isOwn("type", columns.type);
        const bool hasSource = isOwn("source", columns.source);
        m_fit.withType += hasType ? 1 : 0;
        m_fit.withSource += hasSource ? 1 : 0;
        bool hasDetail = hasType || hasSource || isOwn("system", columns.system) ||
                         isOwn("class", columns.entryClass);
        if (!hasDetail) {
            m_fields.clear();
            m_reader->readFields(m_entry, m_fields);
            hasDetail = !m_fields.all().empty();
        }
        m_fit.withDetail += hasDetail ? 1 : 0;
    }

    bool isOwn(const char* column, std::string_view text) const {
        const auto filled = m_description.defaults.find(column);
        return !text.empty() && (filled == m_description.defaults.end() || filled->second != text);
    }

    const FormatDescription& m_description;
    const std::shared_ptr<const EntryFormat> m_format;
    const std::shared_ptr<const LineJoin> m_join;
    const std::unique_ptr<EntryFormat::Reader> m_reader;
    EntryFields m_fields;
    FormatFit m_fit;
    const std::string* m_previous = nullptr;
    std::string m_entry;
    std::size_t m_lines = 0;        ///< of the entry
    std::size_t m_plainOfEntry = 0; ///< of the entry: others, behind its first
    std::size_t m_begun = 0;        ///< lines that begin entries
    std::size_t m_plain = 0;        ///< lines that are neither indented nor empty
    std::size_t m_swallowed = 0;    ///< of these, those that continue an entry that fits
};

} // namespace

double FormatFit::share() const noexcept {
    return partOf(fitting, lines);
}

double FormatFit::score() const noexcept {
    constexpr double program = 0.1; ///< less than a source of its own
    return scoreWithoutProgram() +
           (namesProgram ? share() * program * partOf(entries - withSource, entries) : 0);
}

double FormatFit::scoreWithoutProgram() const noexcept {
    constexpr double base = 0.3;
    constexpr double each = 0.2;
    constexpr double detail = 0.1;
    return share() * (base +
                      each * (partOf(withTime, entries) + partOf(withType, entries) +
                              partOf(withSource, entries)) +
                      detail * partOf(withDetail, entries));
}

bool FormatFit::fits(const FormatDescription& format, const EntryColumns& columns) noexcept {
    if (format.type != "syslog") {
        return true;
    }
    return isHost(columns.system) && columns.source.find(' ') == std::string_view::npos &&
           (columns.hasTime || !columns.system.empty());
}

Result<FormatFit> FormatFit::of(const FormatDescription& format,
                                const std::vector<std::string>& lines) {
    auto made = makeFormat(format);
    if (!made) {
        return tl::unexpected(std::move(made.error()));
    }
    auto join = makeLineJoin(format);
    if (!join) {
        return tl::unexpected(std::move(join.error()));
    }
    return Fitting(format, std::move(*made), std::move(*join)).run(lines);
}

} // namespace zrm::host
