#include "host/formats/FlatJson.h"

#include "framework/LogEntry.h"
#include "host/formats/JsonToken.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <new>
#include <span>

namespace zrm::host {

namespace {

constexpr std::size_t builtRoom = EntryFields::most * EntryFields::longestName;
constexpr std::string_view notJson = "it is not JSON";
constexpr std::string_view notEnded = "it does not end with the end of a JSON object";

} // namespace

/// While it exists, names are those of what `name` holds.
class FlatJson::Below {
public:
    Below(FlatJson& json, std::string_view name) noexcept
        : m_json(json), m_before(json.m_pathLength) {
        if (name.data() == nullptr || name.size() >= sizeof json.m_path) {
            json.m_pathLength = sizeof json.m_path + 1;
            return;
        }
        // The name of something nested is in its place already.
        std::memmove(json.m_path, name.data(), name.size());
        json.m_path[name.size()] = '.';
        json.m_pathLength = name.size() + 1;
    }
    Below(const Below&) = delete;
    Below& operator=(const Below&) = delete;
    ~Below() { m_json.m_pathLength = m_before; }

private:
    FlatJson& m_json;
    const std::size_t m_before;
};

inline void FlatJson::keep(std::string_view name, std::string_view value, bool isNumber) noexcept {
    m_fields[m_count] = {name, value};
    ++m_members;
    if (m_pathLength == 0 && !name.empty() && !m_names.mayHave(name)) {
        m_count += m_count < EntryFields::most && name.size() <= EntryFields::longestName ? 1 : 0;
    } else {
        keepSpecial(isNumber);
    }
}

/// The rest of keep() for a member that may fill a column, or whose name is not what it is stored
/// as. Apart from the function that runs for each.
[[gnu::noinline]] void FlatJson::keepSpecial(bool isNumber) noexcept {
    EntryFields::Field& field = m_fields[m_count];
    m_names.find(field.name,
                 [&](const JsonName& known) { m_columns.add(known, field.value, isNumber); });
    if (m_count == EntryFields::most) {
        return;
    }
    if (m_pathLength != 0) {
        field.name = built(field.name);
    }
    m_count += !field.name.empty() && field.name.size() <= EntryFields::longestName ? 1 : 0;
}

/// Goes through the tokens of the text that was scanned.
class FlatJson::Walk {
public:
    explicit Walk(FlatJson& json) noexcept
        : m_json(json), m_text(json.m_scan.text().data()), m_token(json.m_scan.tokens()) {}

    bool walkRoot() noexcept;

private:
    char next() const noexcept { return m_text[*m_token]; }
    bool take(char token) noexcept {
        const bool isNext = next() == token;
        m_token += isNext ? 1 : 0;
        return isNext;
    }
    bool takeMembers(unsigned depth) noexcept;
    bool takeElements(unsigned depth) noexcept;
    bool takeValue(std::string_view name, unsigned depth) noexcept {
        return next() == '"' ? takeText(name) : takeOther(name, depth);
    }
    bool takeText(std::string_view name) noexcept {
        const std::string_view text = takeString();
        m_json.keep(name, text, false);
        return text.data() != nullptr;
    }
    bool takeOther(std::string_view name, unsigned depth) noexcept;
    bool takeWord(std::string_view name) noexcept;
    bool takeNested(std::string_view name, unsigned depth) noexcept;
    bool takeWhole(std::string_view name) noexcept;
    /// Without data if it is refused.
    std::string_view takeString() noexcept {
        const char* const begin = m_text + m_token[0] + 1;
        // Only blanks are between the closing quote and the next token.
        const char* end = m_text + m_token[1] - 1;
        while (*end != '"') {
            --end;
        }
        ++m_token;
        const std::string_view text(begin, static_cast<std::size_t>(end - begin));
        return m_json.m_scan.hasEscapes() ? withoutEscapes(text) : text;
    }
    std::string_view withoutEscapes(std::string_view text) noexcept;
    /// The next token cannot be there.
    bool refuseNext(std::string_view reason = notJson) noexcept {
        return *m_token == m_json.m_scan.text().size() ? m_json.refuse(notEnded)
                                                       : m_json.refuse(reason, *m_token);
    }

    FlatJson& m_json;
    const char* const m_text;
    const std::uint32_t* m_token; ///< the next one
};

bool FlatJson::Walk::walkRoot() noexcept {
    const std::uint32_t* const end = m_token + m_json.m_scan.tokenCount();
    if (m_text[end[-1]] != '}') {
        return m_json.refuse(notEnded);
    }
    ++m_token;
    return takeMembers(1) && (m_token == end || refuseNext("something follows the JSON object"));
}

/// What follows the opening brace.
bool FlatJson::Walk::takeMembers(unsigned depth) noexcept {
    if (take('}')) {
        return true;
    }
    do {
        if (next() != '"') {
            return refuseNext();
        }
        const std::string_view name = takeString();
        if (name.data() == nullptr) {
            return false;
        }
        if (!take(':')) {
            return refuseNext();
        }
        if (!takeValue(m_json.fullName(name), depth)) {
            return false;
        }
    } while (take(','));
    return take('}') || refuseNext();
}

/// What follows the opening bracket.
bool FlatJson::Walk::takeElements(unsigned depth) noexcept {
    if (take(']')) {
        return true;
    }
    std::uint32_t number = 0;
    do {
        char digits[10];
        const char* const end = std::to_chars(digits, digits + sizeof digits, number++).ptr;
        const std::string_view name(digits, static_cast<std::size_t>(end - digits));
        if (!takeValue(m_json.fullName(name), depth)) {
            return false;
        }
    } while (take(','));
    return take(']') || refuseNext();
}

bool FlatJson::Walk::takeOther(std::string_view name, unsigned depth) noexcept {
    if (next() == '{' || next() == '[') {
        return depth < deepest ? takeNested(name, depth + 1) : takeWhole(name);
    }
    return takeWord(name);
}

std::string_view FlatJson::Walk::withoutEscapes(std::string_view text) noexcept {
    if (text.find('\\') == text.npos) {
        return text;
    }
    const std::optional<std::string_view> resolved = m_json.m_scan.withoutEscapes(text);
    if (!resolved) {
        m_json.refuse("a text in it has an escape that is not one of JSON's",
                      static_cast<std::size_t>(text.data() - 1 - m_text));
        return {};
    }
    return *resolved;
}

bool FlatJson::Walk::takeWord(std::string_view name) noexcept {
    const std::string_view word =
        JsonToken::withoutBlanksBehind({m_text + m_token[0], m_token[1] - m_token[0]});
    const bool isNumber = JsonToken::isNumber(word);
    if (isNumber || word == "true" || word == "false") {
        m_json.keep(name, word, isNumber);
    } else if (word != "null") {
        return refuseNext();
    }
    ++m_token;
    return true;
}

bool FlatJson::Walk::takeNested(std::string_view name, unsigned depth) noexcept {
    const Below below(m_json, name);
    const bool isObject = next() == '{';
    ++m_token;
    return isObject ? takeMembers(depth) : takeElements(depth);
}

/// An object or an array, whose own parts are not looked at.
bool FlatJson::Walk::takeWhole(std::string_view name) noexcept {
    const char* const begin = m_text + *m_token;
    std::size_t open = 0;
    do {
        const char token = next();
        if (token == '{' || token == '[') {
            ++open;
        } else if (token == '}' || token == ']') {
            --open;
        } else if (*m_token == m_json.m_scan.text().size()) {
            return refuseNext();
        }
        ++m_token;
    } while (open > 0);
    m_json.keep(name, {begin, static_cast<std::size_t>(m_text + m_token[-1] + 1 - begin)}, false);
    return true;
}

FlatJson::FlatJson(const JsonNames& names)
    : m_names(names), m_fields(new EntryFields::Field[EntryFields::most + 1]) {}

bool FlatJson::read(std::string_view text) noexcept {
    m_isRead = false;
    m_columns.clear();
    m_count = m_members = m_builtSize = m_pathLength = 0;
    const auto begin = std::find_if_not(text.begin(), text.end(), JsonToken::isBlank);
    if (begin == text.end() || *begin != '{') {
        return refuse(begin == text.end() ? "it is empty" : "it is not a JSON object");
    }
    const char* const failure = m_scan.scan(text);
    m_isRead = failure == nullptr ? Walk(*this).walkRoot() : refuse(failure);
    if (!m_isRead && text.size() >= EntryKeep::longestText) {
        refuse("it is longer than 65536 bytes"); // this is its beginning
    }
    return m_isRead;
}

std::string_view FlatJson::nestedName(std::string_view name) noexcept {
    if (m_pathLength + name.size() > sizeof m_path) {
        return {};
    }
    name.copy(m_path + m_pathLength, name.size());
    return {m_path, m_pathLength + name.size()};
}

/// A nested name in memory that stays until the next read. Empty if there is none.
std::string_view FlatJson::built(std::string_view name) noexcept {
    if (!m_built) {
        m_built.reset(new (std::nothrow) char[builtRoom]);
    }
    if (!m_built) {
        return {};
    }
    char* const place = m_built.get() + m_builtSize;
    m_builtSize += name.copy(place, name.size());
    return {place, name.size()};
}

bool FlatJson::isOf(std::string_view text) const noexcept {
    return m_isRead && text == m_scan.text();
}

void FlatJson::addTo(EntryFields& fields) const noexcept {
    fields.add(std::span(m_fields.get(), m_count));
    for (std::size_t i = m_count; i < m_members; ++i) {
        fields.noteLeftOut();
    }
}

bool FlatJson::refuse(std::string_view reason) noexcept {
    m_reasonLength = reason.copy(m_reason, sizeof m_reason);
    return false;
}

/// `place`: of the byte that is wrong.
bool FlatJson::refuse(std::string_view reason, std::size_t place) noexcept {
    constexpr std::string_view words = ", at byte ";
    refuse(reason);
    m_reasonLength += words.copy(m_reason + m_reasonLength, words.size());
    char* const end = m_reason + sizeof m_reason;
    m_reasonLength = static_cast<std::size_t>(
        std::to_chars(m_reason + m_reasonLength, end, place + 1).ptr - m_reason);
    return false;
}

} // namespace zrm::host
