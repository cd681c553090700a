#include "host/events/EntryContext.h"

#include "host/base/Utf8.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

void EntryContext::keep(std::size_t entries) {
    const std::size_t size = entries == 0 ? 0 : std::min(entries, mostEntries) + 1;
    const std::size_t kept = std::min(count(), size);
    std::vector<std::string> texts(size);
    for (std::size_t ago = 0; ago < kept; ++ago) {
        texts[kept - 1 - ago] = text(ago);
    }
    for (std::string& text : texts) {
        text.reserve(longestEntry);
    }
    m_texts = std::move(texts);
    m_added = kept;
}

void EntryContext::add(std::string_view text) {
    m_texts[m_added % m_texts.size()] = Utf8::prefix(text, longestEntry);
    ++m_added;
}

std::vector<std::string_view> EntryContext::before(std::size_t entries) const {
    std::vector<std::string_view> texts;
    std::size_t bytes = 0;
    for (std::size_t ago = 1; ago < count() && ago <= entries; ++ago) {
        bytes += text(ago).size();
        if (bytes > mostBytes) {
            break;
        }
        texts.push_back(text(ago));
    }
    std::reverse(texts.begin(), texts.end());
    return texts;
}

std::size_t EntryContext::count() const noexcept {
    return static_cast<std::size_t>(std::min<std::uint64_t>(m_added, m_texts.size()));
}

const std::string& EntryContext::text(std::size_t ago) const noexcept {
    return m_texts[(m_added - 1 - ago) % m_texts.size()];
}

} // namespace zrm::host
