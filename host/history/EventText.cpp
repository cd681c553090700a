#include "host/history/EventText.h"

#include "host/base/Utf8.h"

#include <algorithm>
#include <cstddef>
#include <utility>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using nlohmann::json;

/// Nobody searches for digits of times or for what all events of an agent have in common.
constexpr std::array leftOut = {"ORIGINNODE", "ENTRYTIME", "TIMESTAMP"};

constexpr char lower(char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

std::string lowered(std::string_view text) {
    std::string result(text);
    std::transform(result.begin(), result.end(), result.begin(), lower);
    return result;
}

/// Whether the JSON of events contains the character unescaped, whichever version of this program
/// wrote it: no controls, no quotes, and no characters of blocks with invisible ones.
bool isPlain(std::string_view character) {
    constexpr std::string_view leadsOfOthers = "\xc2\xd8\xe2\xef";
    const char first = character.front();
    return character.size() == 1 ? first >= ' ' && first < 0x7f && first != '"' && first != '\\'
                                 : leadsOfOthers.find(first) == std::string_view::npos;
}

std::string longestPlainPart(std::string_view text) {
    std::string_view longest;
    std::size_t begin = 0;
    for (std::size_t at = 0; at < text.size();) {
        const std::size_t length = Utf8::firstSequence(text.substr(at)).length;
        const bool isPart = isPlain(text.substr(at, length));
        at += length;
        begin = isPart ? begin : at;
        if (at - begin > longest.size()) {
            longest = text.substr(begin, at - begin);
        }
    }
    return std::string(longest);
}

} // namespace

EventText::Pattern::Pattern(std::string lowerCase) : m_text(std::move(lowerCase)) {
    constexpr std::size_t most = UINT8_MAX;
    m_skip.fill(static_cast<std::uint8_t>(std::min(m_text.size(), most)));
    for (std::size_t at = 0; at + 1 < m_text.size(); ++at) {
        const auto skip = static_cast<std::uint8_t>(std::min(m_text.size() - 1 - at, most));
        const char c = m_text[at];
        m_skip[static_cast<unsigned char>(c)] = skip;
        if (c >= 'a' && c <= 'z') {
            m_skip[static_cast<unsigned char>(c - 'a' + 'A')] = skip;
        }
    }
}

bool EventText::Pattern::isIn(std::string_view text) const noexcept {
    if (m_text.empty()) {
        return true;
    }
    const std::size_t size = m_text.size();
    for (std::size_t end = size; end <= text.size();) {
        const char last = text[end - 1];
        if (lower(last) == m_text.back() &&
            std::equal(m_text.begin(), m_text.end() - 1, text.data() + end - size,
                       [](char wanted, char c) { return wanted == lower(c); })) {
            return true;
        }
        end += m_skip[static_cast<unsigned char>(last)];
    }
    return false;
}

EventText::EventText(std::string_view text)
    : m_whole(lowered(text)), m_plain(longestPlainPart(lowered(text))) {}

bool EventText::isIn(std::string_view log, std::string_view document) const {
    if (m_whole.isIn(log)) {
        return true;
    }
    if (!m_plain.isIn(document)) { // rules out most events without parsing them
        return false;
    }
    const json event = json::parse(document, nullptr, false);
    if (!event.is_object()) {
        return true;
    }
    const auto hasText = [&](const json& value) {
        return value.is_string() && m_whole.isIn(value.get_ref<const std::string&>());
    };
    for (const char* const name : {"situation", "text", "entry"}) {
        const auto text = event.find(name);
        if (text != event.end() && hasText(*text)) {
            return true;
        }
    }
    for (const char* const name : {"fields", "group", "labels"}) {
        const auto values = event.find(name);
        if (values != event.end() && std::any_of(values->begin(), values->end(), hasText)) {
            return true;
        }
    }
    const auto row = event.find("row");
    if (row == event.end()) {
        return false;
    }
    for (const auto& [name, value] : row->items()) {
        if (std::find(leftOut.begin(), leftOut.end(), name) == leftOut.end() && hasText(value)) {
            return true;
        }
    }
    return false;
}

} // namespace zrm::host
