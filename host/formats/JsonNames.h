#ifndef ZRM_HOST_JSON_NAMES_H
#define ZRM_HOST_JSON_NAMES_H

#include "host/formats/EntryColumn.h"

#include <array>
#include <cstdint>
#include <map>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// A name under which a field fills a column.
struct JsonName {
    std::string text;
    EntryColumn column;
    std::uint8_t rank;   ///< of several fields for a column the one of the lowest rank fills it
    bool isUsual;        ///< one of the names that loggers use: upper and lower case are the same
    std::uint16_t place; ///< where it is looked for first
};

/// A field that can fill a column.
struct JsonCandidate {
    const JsonName* name = nullptr;
    std::string_view value;
    bool isNumber = false;
};

/// Which fields of JSON objects fill which columns. Not changed after it was made; any thread.
class JsonNames {
public:
    /// `columns` says it for some columns, where an empty name stands for none; for the others, the
    /// names that loggers use are tried in order. Its keys are columns.
    explicit JsonNames(const std::map<std::string, std::string>& columns);

    /// False for most names that find() does not know. The name is not empty.
    bool mayHave(std::string_view name) const noexcept {
        const std::size_t place = placeOf(name);
        return m_starts[place] != m_starts[place + 1];
    }
    /// Calls `use` with every JsonName that fits.
    template <class Use> void find(std::string_view name, const Use& use) const {
        if (name.empty()) {
            return;
        }
        const std::size_t place = placeOf(name);
        const std::span names(m_names);
        for (const JsonName& known :
             names.subspan(m_starts[place], m_starts[place + 1] - m_starts[place])) {
            if (fits(known, name)) {
                use(known);
            }
        }
    }

private:
    static constexpr std::size_t places = 1024; ///< many, so that most have none of the names

    static std::uint16_t placeOf(std::string_view name) noexcept {
        return static_cast<std::uint16_t>(
            (name.size() * 211 + folded(name.front()) * 37 + folded(name.back())) % places);
    }
    /// Lower case for a letter; another character for others, the same for the same.
    static unsigned folded(char character) noexcept {
        return static_cast<unsigned char>(character) | 0x20U;
    }
    static bool isSame(char left, char right) noexcept;
    static bool fits(const JsonName& known, std::string_view name) noexcept;
    void add(EntryColumn column, std::string_view name, std::uint8_t rank, bool isUsual);

    std::vector<JsonName> m_names;                    ///< ordered by place
    std::array<std::uint16_t, places + 1> m_starts{}; ///< of each place, and the end
};

/// The fields of one object that can fill columns.
class JsonColumns {
public:
    static constexpr std::size_t mostTimes = 4;

    void clear() noexcept;
    void add(const JsonName& name, std::string_view value, bool isNumber) noexcept;
    /// What fills a column other than the time; without a name if nothing does.
    const JsonCandidate& of(EntryColumn column) const noexcept {
        return m_best[static_cast<std::size_t>(column)];
    }
    /// What may be the time, the first choice first. The first ones of more than `mostTimes`.
    const JsonCandidate* begin() const noexcept { return m_times.data(); }
    const JsonCandidate* end() const noexcept { return m_times.data() + m_timeCount; }

private:
    void addTime(const JsonCandidate& candidate) noexcept;

    std::array<JsonCandidate, std::size(entryColumnNames)> m_best{};
    std::array<JsonCandidate, mostTimes> m_times{};
    std::size_t m_timeCount = 0;
};

} // namespace zrm::host

#endif
