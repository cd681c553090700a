#ifndef ZRM_HOST_TEXT_POOL_H
#define ZRM_HOST_TEXT_POOL_H

#include <cstddef>
#include <cstdint>
#include <deque>
#include <string>
#include <string_view>
#include <unordered_map>

namespace zrm::host {

/// Keeps each of many texts once and gives it a number. One thread.
class TextPool {
public:
    using Number = std::uint32_t;

    Number add(std::string_view text) {
        const auto found = m_numbers.find(text);
        if (found != m_numbers.end()) {
            return found->second;
        }
        const auto number = static_cast<Number>(m_texts.size());
        m_numbers.emplace(m_texts.emplace_back(text), number);
        m_bytes += text.size() + overhead;
        return number;
    }
    const std::string& text(Number number) const noexcept { return m_texts[number]; }
    /// Memory of all texts, roughly.
    std::size_t bytes() const noexcept { return m_bytes; }

private:
    static constexpr std::size_t overhead = 100;

    std::deque<std::string> m_texts; ///< do not move
    std::unordered_map<std::string_view, Number> m_numbers;
    std::size_t m_bytes = 0;
};

} // namespace zrm::host

#endif
