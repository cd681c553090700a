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
    {"time_format", "regex json"},
    {"columns", "json"},
    {"defaults", "regex json syslog"},
    {"values", "regex json syslog"},
    {"unwrap", "regex json syslog"},
    {"extract", "syslog"},
};

/// The types whose entries may have several lines.
constexpr Key entryKey{"entry", "regex json syslog"};

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

std::map<std::string, std::string> readTexts(ConfigSection& outer, std::string_view key) {
    std::optional<ConfigSection> section = outer.section(key);
    return section ? readTexts(*section) : std::map<std::string, std::string>();
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
        format.values.emplace(column, readTexts(*section, column));
    }
}

} // namespace

std::optional<FormatDescription> FormatReader::read(ConfigSection& section,
                                                    const std::string& type) {
    const std::size_t problems = section.problemCount();
    FormatDescription format;
    format.type = type;
    for (const Key& key : keys) {
        if (!key.isFor(type)) {
            section.refuse(key.name, "has no meaning for type \"" + type + '"');
        }
    }
    if (!entryKey.isFor(type)) {
        section.refuse(entryKey.name, "has no meaning for type \"" + type + '"');
    }
    if (type == "regex") {
        readPatterns(section, format);
    }
    format.timeFormat = section.text("time_format").value_or("");
    format.columns = readTexts(section, "columns");
    format.defaults = readTexts(section, "defaults");
    readValues(section, format);
    format.unwrap = section.text("unwrap").value_or("");
    for (const toml::table* const table :
         section.tables("extract").value_or(std::vector<const toml::table*>())) {
        ConfigSection extract = section.inner("extract", *table);
        format.extracts.push_back(
            {extract.text("source").value_or(""), readList(extract, "patterns")});
        extract.refuseUnknownKeys();
    }
    format.lines = EntryLinesReader::read(section);
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

bool FormatReader::describes(const ConfigSection& section) {
    return std::any_of(std::begin(keys), std::end(keys),
                       [&](const Key& key) { return section.has(key.name); });
}

} // namespace zrm::host
