#include "host/formats/FlatJson.h"

#include "framework/LogEntry.h"
#include "host/formats/JsonToken.h"

#include <algorithm>
#include <bit>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <new>
#include <span>
#include <utility>

#include <simdjson.h>

namespace zrm::host {

namespace {

using simdjson::ondemand::array;
using simdjson::ondemand::object;
using simdjson::ondemand::value;
using Error = simdjson::error_code;

constexpr std::size_t leastRoom = 1024;
constexpr std::size_t builtRoom = EntryFields::most * EntryFields::longestName;

std::string_view meaningOf(Error error) noexcept {
    switch (error) {
    case simdjson::UTF8_ERROR:
        return "it is not valid UTF-8";
    case simdjson::UNCLOSED_STRING:
        return "a text in it has no closing quote";
    case simdjson::UNESCAPED_CHARS:
        return "a text in it has a control character";
    case simdjson::STRING_ERROR:
        return "a text in it has an escape that is not one of JSON's";
    case simdjson::INCOMPLETE_ARRAY_OR_OBJECT:
        return "it does not end with the end of a JSON object";
    case simdjson::TRAILING_CONTENT:
        return "something follows the JSON object";
    case simdjson::MEMALLOC:
        return "there is not enough memory for it";
    default:
        return "it is not JSON";
    }
}

} // namespace

struct FlatJson::Parser {
    simdjson::ondemand::parser parser;
};

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

/// Goes through the text that a FlatJson has copied.
class FlatJson::Walk {
public:
    explicit Walk(FlatJson& json) noexcept : m_json(json) {}

    Error walkRoot() noexcept;
    /// Where the text is wrong; null if that is not known.
    const char* failed() const noexcept { return m_failed; }

private:
    Error walk(object& object, unsigned depth) noexcept;
    Error walk(array& array, unsigned depth) noexcept;
    Error take(value& value, std::string_view name, std::string_view token,
               unsigned depth) noexcept {
        return token.front() == '"' ? takeText(value, name, token)
                                    : takeOther(value, name, token, depth);
    }
    Error takeText(value& value, std::string_view name, std::string_view token) noexcept;
    Error takeOther(value& value, std::string_view name, std::string_view token,
                    unsigned depth) noexcept;
    template <class Container>
    Error takeContainer(value& value, std::string_view name, unsigned depth) noexcept;
    Error fail(Error error, const char* place) noexcept {
        m_failed = place;
        return error;
    }

    FlatJson& m_json;
    const char* m_failed = nullptr;
};

Error FlatJson::Walk::walkRoot() noexcept {
    simdjson::ondemand::document document;
    object root;
    Error error =
        m_json.m_parser->parser
            .iterate(m_json.m_text.get(), m_json.m_size, m_json.m_room + simdjson::SIMDJSON_PADDING)
            .get(document);
    if (!error) {
        error = document.get_object().get(root);
    }
    if (error) {
        return error;
    }
    error = walk(root, 1);
    const char* place = nullptr;
    const bool hasPlace =
        !document.current_location().get(place) && place < m_json.m_text.get() + m_json.m_size;
    if (error && m_failed == nullptr) {
        return hasPlace ? fail(error, place) : simdjson::INCOMPLETE_ARRAY_OR_OBJECT;
    }
    return hasPlace && !error ? fail(simdjson::TRAILING_CONTENT, place) : error;
}

inline Error FlatJson::Walk::takeText(value& value, std::string_view name,
                                      std::string_view token) noexcept {
    std::string_view text = JsonToken::quoted(token);
    // A value that is only skipped may be followed by a colon.
    simdjson::ondemand::raw_json_string raw;
    const Error error = m_json.hasEscapes(text) ? value.get_string().get(text)
                                                : value.get_raw_json_string().get(raw);
    if (error) {
        return fail(error, token.data());
    }
    m_json.keep(name, text);
    return simdjson::SUCCESS;
}

Error FlatJson::Walk::walk(object& object, unsigned depth) noexcept {
    for (auto member : object) {
        simdjson::ondemand::field field;
        if (const Error error = std::move(member).get(field)) {
            return error;
        }
        const std::string_view token = field.value().raw_json_token();
        // Between the name's closing quote and the value there are only a colon and blanks.
        const char* end = token.data() - 1;
        while (*end != '"') {
            --end;
        }
        const char* const begin = field.key().raw();
        std::string_view name(begin, static_cast<std::size_t>(end - begin));
        if (m_json.hasEscapes(name)) {
            if (const Error error = field.unescaped_key().get(name)) {
                return fail(error, begin);
            }
        }
        if (const Error error = take(field.value(), m_json.fullName(name), token, depth)) {
            return error;
        }
    }
    return simdjson::SUCCESS;
}

Error FlatJson::Walk::walk(array& array, unsigned depth) noexcept {
    std::uint32_t number = 0;
    for (auto element : array) {
        value value;
        if (const Error error = std::move(element).get(value)) {
            return error;
        }
        char digits[10];
        const char* const end = std::to_chars(digits, digits + sizeof digits, number++).ptr;
        const std::string_view name(digits, static_cast<std::size_t>(end - digits));
        if (const Error error = take(value, m_json.fullName(name), value.raw_json_token(), depth)) {
            return error;
        }
    }
    return simdjson::SUCCESS;
}

Error FlatJson::Walk::takeOther(value& value, std::string_view name, std::string_view token,
                                unsigned depth) noexcept {
    switch (token.front()) {
    case '{':
        return takeContainer<object>(value, name, depth);
    case '[':
        return takeContainer<array>(value, name, depth);
    default:
        break;
    }
    const std::string_view word = JsonToken::withoutBlanksBehind(token);
    const bool isNumber = JsonToken::isNumber(word);
    if (isNumber || word == "true" || word == "false") {
        m_json.keep(name, word, isNumber);
        return simdjson::SUCCESS;
    }
    return word == "null" ? simdjson::SUCCESS : fail(simdjson::TAPE_ERROR, token.data());
}

template <class Container>
Error FlatJson::Walk::takeContainer(value& value, std::string_view name, unsigned depth) noexcept {
    Container container;
    if (const Error error = value.get(container)) {
        return error;
    }
    if (depth < deepest) {
        const Below below(m_json, name);
        return walk(container, depth + 1);
    }
    std::string_view json;
    if (const Error error = container.raw_json().get(json)) {
        return error;
    }
    m_json.keep(name, JsonToken::withoutBlanksBehind(json));
    return simdjson::SUCCESS;
}

FlatJson::FlatJson(const JsonNames& names)
    : m_names(names), m_parser(std::make_unique<Parser>()),
      m_fields(new EntryFields::Field[EntryFields::most]) {}

FlatJson::~FlatJson() = default;

bool FlatJson::read(std::string_view text) {
    m_isRead = false;
    m_columns.clear();
    m_count = m_leftOut = m_builtSize = m_pathLength = 0;
    const auto begin = std::find_if_not(text.begin(), text.end(), JsonToken::isBlank);
    if (begin == text.end() || *begin != '{') {
        return refuse(begin == text.end() ? "it is empty" : "it is not a JSON object");
    }
    if (!copy(text)) {
        return refuse(meaningOf(simdjson::MEMALLOC));
    }
    Walk walk(*this);
    if (const Error error = walk.walkRoot()) {
        // What is read of an entry is its beginning.
        return text.size() >= EntryKeep::longestText ? refuse("it is longer than 65536 bytes")
                                                     : refuse(meaningOf(error), walk.failed());
    }
    m_isRead = true;
    return true;
}

/// The parser reads a little beyond the end of a text.
bool FlatJson::copy(std::string_view text) noexcept {
    try {
        if (text.size() > m_room) {
            const std::size_t room = std::bit_ceil(std::max(text.size(), leastRoom));
            m_room = 0;
            m_text.reset(new char[room + simdjson::SIMDJSON_PADDING]);
            if (m_parser->parser.allocate(room)) {
                return false;
            }
            m_room = room;
        }
    } catch (const std::bad_alloc&) {
        return false;
    }
    m_size = text.size();
    text.copy(m_text.get(), m_size);
    std::memset(m_text.get() + m_size, ' ', simdjson::SIMDJSON_PADDING);
    m_hasEscapes = text.find('\\') != text.npos;
    return true;
}

void FlatJson::keep(std::string_view name, std::string_view value, bool isNumber) noexcept {
    m_names.find(name, [&](const JsonName& known) { m_columns.add(known, value, isNumber); });
    if (name.data() == m_path) {
        name = m_count < EntryFields::most ? built(name) : std::string_view();
    }
    if (name.empty() || name.size() > EntryFields::longestName || m_count == EntryFields::most) {
        ++m_leftOut;
        return;
    }
    m_fields[m_count++] = {name, value};
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
    return m_isRead && text.size() == m_size && std::memcmp(text.data(), m_text.get(), m_size) == 0;
}

void FlatJson::addTo(EntryFields& fields) const noexcept {
    fields.add(std::span(m_fields.get(), m_count));
    for (std::size_t i = 0; i < m_leftOut; ++i) {
        fields.noteLeftOut();
    }
}

/// `place`: where the text is wrong; null if that is not known.
bool FlatJson::refuse(std::string_view reason, const char* place) noexcept {
    m_reasonLength = reason.copy(m_reason, sizeof m_reason);
    if (place != nullptr) {
        constexpr std::string_view words = ", at byte ";
        m_reasonLength += words.copy(m_reason + m_reasonLength, words.size());
        char* const end = m_reason + sizeof m_reason;
        m_reasonLength = static_cast<std::size_t>(
            std::to_chars(m_reason + m_reasonLength, end, place - m_text.get() + 1).ptr - m_reason);
    }
    return false;
}

} // namespace zrm::host
