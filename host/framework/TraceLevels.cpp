#include "host/framework/TraceLevels.h"

#include <algorithm>
#include <charconv>
#include <iterator>
#include <optional>

namespace zrm::host {

namespace {

constexpr unsigned all = TRC1_ERROR | TRC1_FLOW | TRC1_DETAIL | TRC1_FINE;
constexpr unsigned maxLevel = 0xff;

struct ClassName {
    std::string_view name;
    unsigned level;
};

constexpr ClassName traceClasses[] = {
    {"error", TRC1_ERROR}, {"flow", TRC1_FLOW}, {"detail", TRC1_DETAIL},
    {"fine", TRC1_FINE},   {"all", all},        {"none", 0},
};

std::string_view trimmed(std::string_view text) {
    const std::size_t first = text.find_first_not_of(" \t");
    if (first == std::string_view::npos) {
        return {};
    }
    return text.substr(first, text.find_last_not_of(" \t") - first + 1);
}

/// Removes the part before the separator from the text and returns it trimmed.
std::string_view takePart(std::string_view& text, char separator) {
    const std::size_t end = std::min(text.find(separator), text.size());
    const std::string_view part = trimmed(text.substr(0, end));
    text.remove_prefix(std::min(end + 1, text.size()));
    return part;
}

std::optional<unsigned> numberOf(std::string_view text) {
    const bool isHexadecimal = text.starts_with("0x") || text.starts_with("0X");
    text.remove_prefix(isHexadecimal ? 2 : 0);
    unsigned value = 0;
    const char* const end = text.data() + text.size();
    const auto result = std::from_chars(text.data(), end, value, isHexadecimal ? 16 : 10);
    if (result.ec != std::errc() || result.ptr != end || value > maxLevel) {
        return std::nullopt;
    }
    return value;
}

std::optional<unsigned> classOf(std::string_view name) {
    const auto* const found =
        std::find_if(std::begin(traceClasses), std::end(traceClasses),
                     [name](const ClassName& known) { return known.name == name; });
    return found != std::end(traceClasses) ? found->level : numberOf(name);
}

/// The unit's name without its file extension.
std::string_view stemOf(std::string_view unit) {
    return unit.substr(0, unit.rfind('.'));
}

/// Whether a source file belongs to a class: LogFile and LogFileTail belong to LogFile, LogFiles
/// does not.
bool isUnitOf(std::string_view className, std::string_view stem) {
    if (!stem.starts_with(className)) {
        return false;
    }
    const std::string_view rest = stem.substr(className.size());
    const bool goesOn =
        !rest.empty() && ((rest[0] >= 'a' && rest[0] <= 'z') || (rest[0] >= '0' && rest[0] <= '9'));
    return !goesOn;
}

} // namespace

Result<void> TraceLevels::parse(std::string_view text) {
    TraceLevels parsed;
    while (!text.empty()) {
        const std::string_view word = takePart(text, ',');
        if (word.empty()) {
            continue;
        }
        if (const Result<void> added = parsed.parseWord(word); !added) {
            return added;
        }
    }
    *this = std::move(parsed);
    return {};
}

Result<void> TraceLevels::parseWord(std::string_view word) {
    std::string_view classes = word;
    std::optional<std::string_view> unit;
    if (word.find('=') != std::string_view::npos) {
        unit = takePart(classes, '=');
        if (unit->empty()) {
            return refused("no unit is named before '=' in \"" + std::string(word) + "\"");
        }
        if (!std::all_of(unit->begin(), unit->end(),
                         [](char c) { return c > ' ' && c < '\x7f'; })) {
            return refused("\"" + std::string(*unit) + "\" is not the name of a source file");
        }
    }
    unsigned level = 0;
    bool hasMore = true;
    while (hasMore) {
        hasMore = classes.find('+') != std::string_view::npos;
        const std::string_view name = takePart(classes, '+');
        const std::optional<unsigned> known = classOf(name);
        if (!known) {
            return refused(
                "\"" + std::string(name) + "\" in \"" + std::string(word) +
                "\" is not a trace class; the classes are error, flow, detail, fine, all, none, "
                "or "
                "a number from 0 to 255");
        }
        level |= *known;
    }
    if (unit) {
        m_units.push_back({std::string(*unit), level});
    } else {
        m_general = m_hasGeneral ? m_general | level : level;
        m_hasGeneral = true;
    }
    return {};
}

unsigned TraceLevels::levelOf(std::string_view unit) const noexcept {
    const std::string_view stem = stemOf(unit);
    unsigned level = m_general;
    std::size_t longest = 0;
    for (const Unit& known : m_units) {
        const bool isNamed = known.name == unit || isUnitOf(known.name, stem);
        const std::size_t length = std::min(known.name.size(), stem.size());
        if (isNamed && length >= longest) {
            longest = length;
            level = known.level;
        }
    }
    return level;
}

} // namespace zrm::host
