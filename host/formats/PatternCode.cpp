#include "host/formats/PatternCode.h"

#include <algorithm>

namespace zrm::host {

void ByteSet::addAll(const ByteSet& other) noexcept {
    for (std::size_t byte = 0; byte < m_has.size(); ++byte) {
        m_has[byte] |= other.m_has[byte];
    }
}

bool ByteSet::intersects(const ByteSet& other) const noexcept {
    for (std::size_t byte = 0; byte < m_has.size(); ++byte) {
        if ((m_has[byte] & other.m_has[byte]) != 0) {
            return true;
        }
    }
    return false;
}

void ByteSet::invert() noexcept {
    std::for_each(m_has.begin(), m_has.begin() + end, [](unsigned char& has) { has ^= 1U; });
}

std::size_t ByteSet::count() const noexcept {
    return static_cast<std::size_t>(std::count(m_has.begin(), m_has.end(), 1));
}

std::uint16_t PatternCode::indexOf(const ByteSet& set) {
    const auto found = std::find(sets.begin(), sets.end(), set);
    const auto index = static_cast<std::size_t>(found - sets.begin());
    if (found == sets.end()) {
        sets.push_back(set);
    }
    return static_cast<std::uint16_t>(index);
}

} // namespace zrm::host
