#include "host/formats/Unwrapper.h"

#include "base/EntryFields.h"

#include <algorithm>

#include <simdjson.h>

namespace zrm::host {

namespace {

namespace ondemand = simdjson::ondemand;

constexpr auto ok = simdjson::SUCCESS;
constexpr std::string_view noCri = "it is not a line of a container: TIME, stdout or stderr, F or "
                                   "P, and the text are expected, with blanks between them";
constexpr std::string_view damaged = "it is damaged JSON";

/// Takes what precedes the next blank, and the blank.
std::string_view takeWord(std::string_view& rest) {
    const std::string_view word = rest.substr(0, rest.find(' '));
    rest.remove_prefix(std::min(word.size() + 1, rest.size()));
    return word;
}

} // namespace

struct Unwrapper::Json {
    simdjson::ondemand::parser parser;
    std::string line; ///< with the bytes behind it that the parser needs
};

std::optional<Unwrapper::Kind> Unwrapper::kindOf(std::string_view name) noexcept {
    return name == "docker" ? std::optional(Kind::docker)
           : name == "cri"  ? std::optional(Kind::cri)
                            : std::nullopt;
}

Unwrapper::Unwrapper(Kind kind)
    : m_kind(kind), m_json(kind == Kind::docker ? std::make_unique<Json>() : nullptr) {}

Unwrapper::~Unwrapper() = default;

bool Unwrapper::refuse(std::string_view reason) noexcept {
    m_reason = reason;
    return false;
}

bool Unwrapper::read(std::string_view entry) {
    m_text.clear();
    for (bool isFirst = true;; isFirst = false) {
        const std::size_t newline = entry.find('\n');
        if (!readLine(entry.substr(0, newline), isFirst)) {
            return false;
        }
        if (newline == std::string_view::npos) {
            break;
        }
        entry.remove_prefix(newline + 1);
    }
    m_isUnfinished = !m_text.ends_with('\n');
    if (!m_isUnfinished) {
        m_text.pop_back();
    }
    if (m_text.ends_with('\r')) {
        m_text.pop_back(); // a terminal's line end
    }
    return true;
}

bool Unwrapper::readLine(std::string_view line, bool isFirst) {
    if (line.ends_with('\r')) {
        line.remove_suffix(1);
    }
    return m_kind == Kind::docker ? readDocker(line, isFirst) : readCri(line, isFirst);
}

/// Appends to the text. The text of a whole line has its line end.
void Unwrapper::append(std::string_view text, std::string_view time, std::string_view stream,
                       bool isFirst) {
    m_text += text;
    if (isFirst) {
        m_time = time;
        m_stream = stream;
    }
}

bool Unwrapper::readCri(std::string_view line, bool isFirst) {
    std::string_view rest = line;
    const std::string_view time = takeWord(rest);
    const std::string_view stream = takeWord(rest);
    const std::string_view tags = takeWord(rest);
    const std::string_view tag = tags.substr(0, tags.find(':'));
    if (time.empty() || (stream != "stdout" && stream != "stderr") || (tag != "F" && tag != "P")) {
        return refuse(noCri);
    }
    append(rest, time, stream, isFirst);
    if (tag == "F") {
        m_text += '\n';
    }
    return true;
}

/// Keeps those that are texts, as Docker writes them.
template <class Object> bool Unwrapper::readAttributes(Object attributes) {
    for (auto attribute : attributes) {
        std::string_view name;
        std::string_view text;
        if (attribute.unescaped_key().get(name) != ok) {
            return false;
        }
        if (m_attributes.size() < EntryFields::most &&
            attribute.value().get_string().get(text) == ok) {
            m_attributes.emplace_back(name, text);
        }
    }
    return true;
}

bool Unwrapper::readDocker(std::string_view line, bool isFirst) {
    std::string& padded = m_json->line;
    padded.assign(line);
    padded.append(simdjson::SIMDJSON_PADDING, ' ');
    m_attributes.clear();
    ondemand::document document;
    ondemand::object members;
    if (m_json->parser.iterate(padded.data(), line.size(), padded.size()).get(document) != ok ||
        document.get_object().get(members) != ok) {
        return refuse("it is not a JSON object, as the lines of Docker's json-file are");
    }
    std::string_view text;
    std::string_view time;
    std::string_view stream;
    for (auto member : members) {
        std::string_view name;
        if (member.unescaped_key().get(name) != ok) {
            return refuse(damaged);
        }
        std::string_view* const wanted = name == "log"      ? &text
                                         : name == "time"   ? &time
                                         : name == "stream" ? &stream
                                                            : nullptr;
        if (wanted != nullptr && member.value().get_string().get(*wanted) != ok) {
            return refuse("its \"log\", its \"stream\" or its \"time\" is not a JSON string");
        }
        ondemand::object attributes;
        if (name == "attrs" && member.value().get_object().get(attributes) == ok &&
            !readAttributes(attributes)) {
            return refuse(damaged);
        }
    }
    if (text.empty()) { // an empty line has its line end
        return refuse("it has no \"log\", as the lines of Docker's json-file have");
    }
    const char* behind = nullptr;
    if (document.current_location().get(behind) == ok && behind < padded.data() + line.size()) {
        return refuse("something follows the JSON object");
    }
    append(text, time, stream, isFirst);
    return true;
}

void Unwrapper::addFields(EntryFields& fields) const {
    const auto taken = [&fields] { return fields.takeText().value_or(std::string_view()); };
    fields.append(m_stream);
    fields.add("stream", taken());
    for (const auto& [name, text] : m_attributes) {
        fields.append("attrs.").append(name);
        const std::string_view fullName = taken();
        fields.append(text);
        fields.add(fullName, taken());
    }
}

} // namespace zrm::host
