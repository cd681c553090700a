#include "host/formats/JsonScan.h"

#include <algorithm>
#include <bit>
#include <cstring>
#include <new>

#include <simdjson.h>

namespace zrm::host {

namespace {

constexpr std::size_t leastRoom = 1024;
constexpr const char* noMemory = "there is not enough memory for it";

const char* meaningOf(simdjson::error_code error) noexcept {
    switch (error) {
    case simdjson::UTF8_ERROR:
        return "it is not valid UTF-8";
    case simdjson::UNCLOSED_STRING:
        return "a text in it has no closing quote";
    case simdjson::UNESCAPED_CHARS:
        return "a text in it has a control character";
    default:
        return "it is not JSON";
    }
}

} // namespace

struct JsonScan::Library {
    std::unique_ptr<simdjson::internal::dom_parser_implementation> parser;
};

JsonScan::JsonScan() noexcept = default;

JsonScan::~JsonScan() = default;

bool JsonScan::reserve(std::size_t size) noexcept {
    if (size <= m_room) {
        return true;
    }
    constexpr std::size_t depth = 1; // only the library's own second stage nests
    const std::size_t room = std::bit_ceil(std::max(size, leastRoom));
    m_room = 0;
    try {
        auto library = std::make_unique<Library>();
        m_text.reset(new char[room + simdjson::SIMDJSON_PADDING]);
        m_resolved.reset(new char[room + simdjson::SIMDJSON_PADDING]);
        if (simdjson::get_active_implementation()->create_dom_parser_implementation(
                room, depth, library->parser) != simdjson::SUCCESS) {
            return false;
        }
        m_library = std::move(library);
    } catch (const std::bad_alloc&) {
        return false;
    }
    m_room = room;
    return true;
}

const char* JsonScan::scan(std::string_view text) noexcept {
    m_size = 0;
    if (!reserve(text.size())) {
        return noMemory;
    }
    // The library reads a little beyond the end of a text.
    text.copy(m_text.get(), text.size());
    std::memset(m_text.get() + text.size(), ' ', simdjson::SIMDJSON_PADDING);
    auto& parser = *m_library->parser;
    const auto error = parser.stage1(reinterpret_cast<const std::uint8_t*>(m_text.get()),
                                     text.size(), simdjson::stage1_mode::regular);
    if (error != simdjson::SUCCESS) {
        return meaningOf(error);
    }
    m_size = text.size();
    m_resolvedSize = 0;
    m_hasEscapes = text.find('\\') != text.npos;
    std::uint32_t* const tokens = parser.structural_indexes.get();
    m_tokens = tokens;
    m_tokenCount = parser.n_structural_indexes;
    tokens[m_tokenCount] = tokens[m_tokenCount + 1] = static_cast<std::uint32_t>(m_size);
    return nullptr;
}

std::optional<std::string_view> JsonScan::withoutEscapes(std::string_view string) noexcept {
    char* const begin = m_resolved.get() + m_resolvedSize;
    const auto* const end =
        m_library->parser->parse_string(reinterpret_cast<const std::uint8_t*>(string.data()),
                                        reinterpret_cast<std::uint8_t*>(begin));
    if (end == nullptr) {
        return std::nullopt;
    }
    const auto length = static_cast<std::size_t>(reinterpret_cast<const char*>(end) - begin);
    m_resolvedSize += length;
    return std::string_view(begin, length);
}

} // namespace zrm::host
