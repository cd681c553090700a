#ifndef ZRM_HOST_JSON_SCAN_H
#define ZRM_HOST_JSON_SCAN_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string_view>

namespace zrm::host {

/// A JSON text and where its tokens begin. The library finds them with the widest instructions that
/// the CPU has. Reused from one text to the next: keeps memory for the longest one, and allocates
/// nothing once it has that. One thread.
class JsonScan {
public:
    JsonScan() noexcept;
    JsonScan(const JsonScan&) = delete;
    JsonScan& operator=(const JsonScan&) = delete;
    ~JsonScan();

    /// Copies a text, which has at least one token, and finds its tokens. Null if it did, else why
    /// it did not: a clause.
    const char* scan(std::string_view text) noexcept;
    /// The copy.
    std::string_view text() const noexcept { return {m_text.get(), m_size}; }
    /// Where the tokens of the text begin, in bytes: braces, brackets, colons, commas, the opening
    /// quotes of strings, and whatever else there is between these and blanks. All strings are
    /// closed and without control characters, and the text is UTF-8. Two more places, behind the
    /// last, are the text's size, where the copy has a blank.
    const std::uint32_t* tokens() const noexcept { return m_tokens; }
    std::size_t tokenCount() const noexcept { return m_tokenCount; }

    /// Whether there is a backslash in the text.
    bool hasEscapes() const noexcept { return m_hasEscapes; }
    /// A string of the copy, given without its quotes, with its escapes resolved: in memory of this
    /// object until the next scan. None if an escape is not one of JSON's. At most once for each.
    std::optional<std::string_view> withoutEscapes(std::string_view string) noexcept;

private:
    struct Library; // keeps the library's header out of this one

    bool reserve(std::size_t size) noexcept;

    std::unique_ptr<Library> m_library;
    std::unique_ptr<char[]>
        m_text; ///< `m_room` bytes, and those that the library needs behind them
    std::unique_ptr<char[]> m_resolved; ///< the same: strings without their escapes
    std::size_t m_room = 0;
    std::size_t m_size = 0;
    std::size_t m_resolvedSize = 0;
    const std::uint32_t* m_tokens = nullptr;
    std::size_t m_tokenCount = 0;
    bool m_hasEscapes = false;
};

} // namespace zrm::host

#endif
