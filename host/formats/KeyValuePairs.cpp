#include "host/formats/KeyValuePairs.h"

#include <algorithm>

namespace zrm::host {

namespace {

constexpr std::size_t none = std::string_view::npos;

/// The audit daemon separates some pairs with a control character.
constexpr bool isBlank(char character) noexcept {
    return static_cast<unsigned char>(character) <= ' ';
}

/// A pair may begin behind a bar, as the first one of security products does.
constexpr bool isBefore(char character) noexcept {
    return isBlank(character) || character == '|';
}

constexpr bool isKeyCharacter(char character) noexcept {
    return (character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z') ||
           (character >= '0' && character <= '9') || character == '_' || character == '.' ||
           character == '-' || character == '@' || character == '/';
}

/// Where a quoted text ends that begins at 0 with its quote; none if it does not.
std::size_t endOfQuoted(std::string_view text) noexcept {
    for (std::size_t at = 1;;) {
        at = text.find_first_of("\"\\", at);
        if (at == none || text[at] == '"') {
            return at;
        }
        at += 2;
    }
}

} // namespace

std::size_t KeyValuePairs::keyLength(std::string_view text) noexcept {
    const auto end = std::find_if_not(text.begin(), text.end(), isKeyCharacter);
    const auto length = static_cast<std::size_t>(end - text.begin());
    return length < text.size() && text[length] == '=' && length <= EntryFields::longestName
               ? length
               : 0;
}

bool KeyValuePairs::begin(std::string_view text) noexcept {
    return keyLength(text) > 0;
}

bool KeyValuePairs::next(Pair& pair) noexcept {
    while (!m_rest.empty()) {
        const auto first = std::find_if_not(m_rest.begin(), m_rest.end(), isBefore);
        m_rest.remove_prefix(static_cast<std::size_t>(first - m_rest.begin()));
        const std::size_t length = keyLength(m_rest);
        if (length > 0) {
            pair.key = m_rest.substr(0, length);
            m_rest.remove_prefix(length + 1);
            takeValue(pair);
            return true;
        }
        const auto end = std::find_if(m_rest.begin(), m_rest.end(), isBefore);
        m_rest.remove_prefix(static_cast<std::size_t>(end - m_rest.begin()));
    }
    return false;
}

void KeyValuePairs::takeValue(Pair& pair) noexcept {
    const char quote = m_rest.empty() ? '\0' : m_rest.front();
    const std::size_t quoted = quote == '"' ? endOfQuoted(m_rest) : none;
    pair.isQuoted = quoted != none;
    if (pair.isQuoted) {
        pair.value = m_rest.substr(1, quoted - 1);
        m_rest.remove_prefix(quoted + 1);
        return;
    }
    if (quote == '\'') {
        m_rest.remove_prefix(1); // the pairs within are next
        pair.value = m_rest.substr(0, m_rest.find('\''));
        return;
    }
    const auto end = std::find_if(m_rest.begin(), m_rest.end(), isBlank);
    const auto length = static_cast<std::size_t>(end - m_rest.begin());
    pair.value = m_rest.substr(0, length);
    m_rest.remove_prefix(length);
    const std::size_t last = pair.value.find_last_not_of(",;'");
    pair.value = pair.value.substr(0, last == none ? 0 : last + 1);
}

std::string_view KeyValuePairs::escaped(std::string_view value, std::size_t at) noexcept {
    switch (value[at]) {
    case 'n':
        return "\n";
    case 't':
        return "\t";
    case 'r':
        return "\r";
    case '"':
    case '\\':
        return value.substr(at, 1);
    default:
        return value.substr(at - 1, 2);
    }
}

void KeyValuePairs::addTo(EntryFields& fields, const Pair& pair) noexcept {
    if (!pair.isQuoted || pair.value.find('\\') == none) {
        fields.add(pair.key, pair.value);
        return;
    }
    unescape(pair.value, fields);
    if (const auto value = fields.takeText()) {
        fields.add(pair.key, *value);
    } else {
        fields.noteLeftOut();
    }
}

void KeyValuePairs::addTo(EntryFields& fields, std::string_view text) noexcept {
    KeyValuePairs pairs(text);
    for (Pair pair; pairs.next(pair);) {
        addTo(fields, pair);
    }
}

} // namespace zrm::host
