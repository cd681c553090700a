#include "host/config/FormatReader.h"

#include "host/config/EntryLinesReader.h"

#include <algorithm>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

/// A key, and the types of format for which it has a meaning.
struct Key {
    std::string_view name;
    std::string_view types;

    bool isFor(std::string_view type) const {
        return (' ' + std::string(types) + ' ').find(' ' + std::string(type) + ' ') !=
               std::string::npos;
    }
};

constexpr Key keys[] = {
    {"format", "regex"},
    {"time_format", "regex json logfmt"},
    {"columns", "json logfmt"},
    {"defaults", "regex json logfmt syslog journal"},
    {"values", "regex json logfmt syslog journal"},
    {"unwrap", "regex json logfmt syslog"},
    {"extract", "syslog journal"},
    {"pairs", "regex syslog journal"},
};

/// The types whose entries may have several lines.
constexpr Key entryKey{"entry", "regex json logfmt syslog journal"};

/// The texts of a table, by key.
std::map<std::string, std::string> readTexts(ConfigSection& section) {
    std::map<std::string, std::string> texts;
    for (const std::string& key : section.keys()) {
        if (std::optional<std::string> text = section.text(key)) {
            texts.emplace(key, std::move(*text));
        }
    }
    return texts;
}

/// Those that are there already are replaced.
void readTexts(ConfigSection& outer, std::string_view key,
               std::map<std::string, std::string>& texts) {
    if (std::optional<ConfigSection> section = outer.section(key)) {
        for (auto& [name, text] : readTexts(*section)) {
            texts.insert_or_assign(name, std::move(text));
        }
    }
}

std::vector<std::string> readList(ConfigSection& section, std::string_view key) {
    std::vector<std::string> list;
    for (auto& [text, line] : section.texts(key).value_or(std::vector<ConfigSection::Text>())) {
        list.push_back(std::move(text));
    }
    return list;
}

void readPatterns(ConfigSection& section, FormatDescription& format) {
    if (!section.has("format") && !section.has("unwrap")) {
        section.problem("format", "is missing, and type \"regex\" needs it",
                        R"(describe the entries, for example '(?P<time>\S+ \S+) )"
                        R"((?P<type>\w+) (?P<description>.*)')");
    }
    format.patterns = readList(section, "format");
}

void readValues(ConfigSection& outer, FormatDescription& format) {
    std::optional<ConfigSection> section = outer.section("values");
    for (const std::string& column : section ? section->keys() : std::vector<std::string>()) {
        readTexts(*section, column, format.values[column]);
    }
}

} // namespace

std::optional<FormatDescription> FormatReader::read(ConfigSection& section,
                                                    const std::string& type) {
    const std::size_t problems = section.problemCount();
    FormatDescription format;
    format.type = type;
    if (type != "regex") {
        section.refuse("format", "has no meaning for type \"" + type + '"');
    } else {
        readPatterns(section, format);
    }
    std::optional<FormatDescription> whole = readOver(section, std::move(format));
    return section.problemCount() == problems ? std::move(whole) : std::nullopt;
}

std::optional<FormatDescription> FormatReader::readOver(ConfigSection& section,
                                                        FormatDescription format) {
    const std::size_t problems = section.problemCount();
    for (const Key& key : keys) {
        if (key.name != "format" && !key.isFor(format.type)) {
            section.refuse(key.name, "has no meaning for type \"" + format.type + '"');
        }
    }
    if (!entryKey.isFor(format.type)) {
        section.refuse(entryKey.name, "has no meaning for type \"" + format.type + '"');
    }
    format.timeFormat = section.text("time_format").value_or(format.timeFormat);
    readTexts(section, "columns", format.columns);
    readTexts(section, "defaults", format.defaults);
    readValues(section, format);
    format.unwrap = section.text("unwrap").value_or(format.unwrap);
    format.pairs = section.truth("pairs").value_or(format.pairs);
    for (const toml::table* const table :
         section.tables("extract").value_or(std::vector<const toml::table*>())) {
        ConfigSection extract = section.inner("extract", *table);
        format.extracts.push_back(
            {extract.text("source").value_or(""), readList(extract, "patterns")});
        extract.refuseUnknownKeys();
    }
    if (section.has(entryKey.name)) {
        format.lines = EntryLinesReader::read(section);
    }
    return section.problemCount() == problems ? std::optional(std::move(format)) : std::nullopt;
}

std::shared_ptr<const EntryFormat> FormatReader::make(ConfigSection& section,
                                                      const FormatDescription& description) {
    auto format = makeFormat(description);
    if (!format) {
        const Problem& problem = format.error();
        const std::string field = problem.field.empty() ? "format" : problem.field;
        section.problem(section.line(field.substr(0, field.find('.'))), field, problem.what,
                        problem.cure);
        return nullptr;
    }
    return std::move(*format);
}

void FormatReader::passOver(ConfigSection& section) {
    for (const Key& key : keys) {
        section.passOver(key.name);
    }
    section.passOver(entryKey.name);
}

bool FormatReader::describes(const ConfigSection& section) {
    return std::any_of(std::begin(keys), std::end(keys),
                       [&](const Key& key) { return section.has(key.name); });
}

} // namespace zrm::host
