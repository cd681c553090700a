#include "host/diagnose/TomlText.h"

#include "host/config/PathPattern.h"
#include "host/formats/FormatDescription.h"

#include <algorithm>
#include <cstdio>

namespace zrm::host {

namespace {

constexpr bool isControl(char character) noexcept {
    const auto code = static_cast<unsigned char>(character);
    return (code < ' ' && character != '\t') || code == 0x7f;
}

/// One text as itself, several as a list.
std::string listed(const std::vector<std::string>& texts, const char* separator) {
    if (texts.size() == 1) {
        return TomlText::quoted(texts.front());
    }
    std::string list = "[";
    for (const std::string& text : texts) {
        list += (&text == &texts.front() ? "" : separator) + TomlText::quoted(text);
    }
    return list + ']';
}

std::string beginning(std::string_view log) {
    return "[[log]]\npath = " + TomlText::quoted(PathPattern::literal(log)) + '\n';
}

} // namespace

std::string TomlText::quoted(std::string_view text) {
    const bool isPlain = text.find('\'') == std::string_view::npos &&
                         std::none_of(text.begin(), text.end(), isControl);
    if (isPlain) {
        return '\'' + std::string(text) + '\'';
    }
    std::string quoted = "\"";
    for (const char character : text) {
        if (isControl(character)) {
            char escape[7];
            std::snprintf(escape, sizeof escape, "\\u%04x",
                          static_cast<unsigned>(static_cast<unsigned char>(character)));
            quoted += escape;
            continue;
        }
        if (character == '"' || character == '\\') {
            quoted += '\\';
        }
        quoted += character;
    }
    return quoted + '"';
}

std::string TomlText::logTable(std::string_view log, const std::vector<std::string>& formats) {
    return beginning(log) +
           (formats.empty() ? "type = 'syslog'\n" : "format = " + listed(formats, ", ") + '\n');
}

std::string TomlText::logTable(std::string_view log, const FormatDescription& format) {
    std::string table =
        beginning(log) + "type = 'regex'\nformat = " + listed(format.patterns, ",\n    ") + '\n';
    if (!format.timeFormat.empty()) {
        table += "time_format = " + quoted(format.timeFormat) + '\n';
    }
    for (const auto& [column, texts] : format.values) {
        std::string pairs;
        for (const auto& [from, to] : texts) {
            pairs += (pairs.empty() ? " " : ", ") + quoted(from) + " = " + quoted(to);
        }
        table += "values." + column + " = {" + pairs + " }\n";
    }
    if (!format.lines.starts.empty()) {
        table += "entry = { starts = " + quoted(format.lines.starts) + " }\n";
    }
    return table + (format.pairs ? "pairs = true\n" : "");
}

} // namespace zrm::host
