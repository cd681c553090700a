#include "host/config/SinkOptionReader.h"

#include "host/base/ListenAddress.h"
#include "host/base/TimeText.h"
#include "host/config/HttpUrl.h"
#include "host/config/SinkTypes.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <utility>

namespace zrm::host {

namespace {

bool isControl(char c) {
    return static_cast<unsigned char>(c) < 0x20 || c == 0x7f;
}

bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

bool isLetter(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}

bool isText(const SinkOption& option, std::string_view text) {
    return !text.empty() && text.size() <= static_cast<std::size_t>(option.most) &&
           std::none_of(text.begin(), text.end(), isControl);
}

bool isChoice(const SinkOption& option, std::string_view text) {
    return std::find(option.choices.begin(), option.choices.end(), text) != option.choices.end();
}

bool isUrl(const SinkOption&, std::string_view text) {
    return HttpUrl::parse(text).has_value();
}

bool isAddress(const SinkOption&, std::string_view text) {
    const std::optional<ListenAddress> address = ListenAddress::parse(text);
    return address && address->port != 0;
}

bool isPath(const SinkOption&, std::string_view text) {
    return text.starts_with('/');
}

bool isOutput(const SinkOption& option, std::string_view text) {
    return text == "-" || isPath(option, text);
}

/// What a text option of some kind accepts.
struct TextKind {
    SinkOption::Kind kind;
    bool (*accepts)(const SinkOption& option, std::string_view text);
    const char* what; ///< what a rejected text is not
    const char* cure; ///< empty: cureOf derives it from the option
};

constexpr std::array textKinds = {
    TextKind{SinkOption::TEXT, isText, "is not usable text", ""},
    TextKind{SinkOption::CHOICE, isChoice, "is none of the choices", ""},
    TextKind{SinkOption::URL, isUrl, "is not a URL that events can be sent to",
             "write http:// or https://, a host, and a port and a path where they are needed"},
    TextKind{SinkOption::ADDRESS, isAddress, "is not an address that events can be sent to",
             "write HOST:PORT, an IPv6 address in brackets"},
    TextKind{SinkOption::PATH, isPath, "is not an absolute path", "begin it with '/'"},
    TextKind{SinkOption::OUTPUT, isOutput, "is not an absolute path",
             "begin it with '/', or write \"-\" for standard output"},
};

std::string cureOf(const SinkOption& option) {
    if (option.kind == SinkOption::TEXT) {
        return "write 1 to " + std::to_string(option.most) + " bytes without control characters";
    }
    std::string text = "write ";
    for (const std::string_view& choice : option.choices) {
        const bool isFirst = &choice == &option.choices.front();
        const bool isLast = &choice == &option.choices.back();
        text += isFirst ? "" : isLast ? " or " : ", ";
        text += choice;
    }
    return text;
}

/// Whether an operator may add a label of this name to those of an alert.
bool isLabelName(std::string_view name) {
    constexpr std::array<std::string_view, 4> own = {"alertname", "severity", "log", "node"};
    return !name.empty() && std::find(own.begin(), own.end(), name) == own.end() &&
           !isDigit(name.front()) && !name.starts_with("__") &&
           std::all_of(name.begin(), name.end(),
                       [](char c) { return isLetter(c) || isDigit(c) || c == '_'; });
}

bool isAttributeName(std::string_view name) {
    return !name.empty() && std::none_of(name.begin(), name.end(), isControl);
}

/// What an option of some table kind accepts as a name.
struct TableKind {
    SinkOption::Kind kind;
    bool (*accepts)(std::string_view name);
    const char* what;
    const char* cure;
};

constexpr std::array tableKinds = {
    TableKind{SinkOption::HEADERS, isAddableHeader, "is not the name of a header that can be added",
              "use letters, digits and dashes; what describes the request is set already"},
    TableKind{SinkOption::LABELS, isLabelName, "is not the name of a label that can be added",
              "use letters, digits and underscores, a letter first; alertname, severity, log and "
              "node are set already"},
    TableKind{SinkOption::ATTRIBUTES, isAttributeName, "is not the name of an attribute",
              "write at least one character and no control characters"},
};

template <typename Table> const auto& rowOf(const Table& table, SinkOption::Kind kind) {
    return *std::find_if(table.begin(), table.end(),
                         [&](const auto& row) { return row.kind == kind; });
}

} // namespace

std::optional<SinkConfig::Value> SinkOptionReader::read(const SinkOption& option) {
    switch (option.kind) {
    case SinkOption::NUMBER:
        return readNumber(option);
    case SinkOption::DURATION:
        return readDuration(option);
    case SinkOption::HEADERS:
    case SinkOption::LABELS:
    case SinkOption::ATTRIBUTES:
        return readTexts(option);
    default:
        return readText(option);
    }
}

void SinkOptionReader::checkText(const SinkOption& option, const std::string& text) {
    const TextKind& kind = rowOf(textKinds, option.kind);
    if (!kind.accepts(option, text)) {
        // A free text may be a secret, and the line number identifies it anyway.
        const bool isShown =
            option.kind != SinkOption::TEXT && std::none_of(text.begin(), text.end(), isControl);
        m_section.problem(option.name, (isShown ? "'" + text + "' " : "") + kind.what,
                          *kind.cure == '\0' ? cureOf(option) : kind.cure);
    }
}

SinkOptionReader::Value SinkOptionReader::readText(const SinkOption& option) {
    const std::optional<std::string> text = m_section.text(option.name);
    if (text) {
        checkText(option, *text);
        return *text;
    }
    const bool hasDefault = option.need == SinkOption::OPTIONAL && !option.value.empty();
    return hasDefault ? Value(std::string(option.value)) : std::nullopt;
}

SinkOptionReader::Value SinkOptionReader::readNumber(const SinkOption& option) {
    std::int64_t number = 0;
    std::from_chars(option.value.data(), option.value.data() + option.value.size(), number);
    number = m_section.number(option.name).value_or(number);
    if (number < option.least || number > option.most) {
        m_section.problem(option.name, std::to_string(number) + " is out of bounds",
                          "write a number from " + std::to_string(option.least) + " to " +
                              std::to_string(option.most));
    }
    return number;
}

SinkOptionReader::Value SinkOptionReader::readDuration(const SinkOption& option) {
    const std::string text = m_section.text(option.name).value_or(std::string(option.value));
    const std::optional<std::chrono::seconds> length = DurationText::parse(text);
    if (!length || length->count() < option.least || length->count() > option.most) {
        m_section.problem(option.name, "'" + text + "' is not a usable duration",
                          "write a number and s, m, h or d, from " + std::to_string(option.least) +
                              "s to " + std::to_string(option.most) + "s");
        return std::nullopt;
    }
    return std::chrono::milliseconds(*length);
}

SinkOptionReader::Value SinkOptionReader::readTexts(const SinkOption& option) {
    const toml::table* const table = m_section.table(option.name);
    if (table == nullptr) {
        return std::nullopt;
    }
    const TableKind& kind = rowOf(tableKinds, option.kind);
    ConfigSection section("sink." + std::string(option.name), *table, m_problems);
    SinkConfig::Texts texts;
    for (const auto& [key, node] : *table) {
        const std::string name(key.str());
        const std::optional<std::string> text = section.text(name);
        if (!kind.accepts(name)) {
            section.problem(name, kind.what, kind.cure);
        } else if (text && std::any_of(text->begin(), text->end(), isControl)) {
            section.problem(name, "contains control characters", "leave them out");
        }
        texts.emplace(name, text.value_or(""));
    }
    return texts;
}

} // namespace zrm::host
