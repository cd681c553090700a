#ifndef ZRM_LATEST_H
#define ZRM_LATEST_H

#include <algorithm>
#include <cstddef>
#include <memory>
#include <new>
#include <vector>

namespace zrm {

/// The latest elements of a kind that were noted, up to a fixed number of them. The first one
/// allocates the memory for all. Not locked.
template <typename Element, std::size_t mostKept> class Latest {
public:
    /// The slot for the next element, which replaces the oldest once there are mostKept; null
    /// without memory.
    Element* next() noexcept {
        if (!m_elements) {
            m_elements.reset(new (std::nothrow) Element[mostKept]);
        }
        return m_elements ? &m_elements[m_count++ % mostKept] : nullptr;
    }
    /// The newest element; null: there is none.
    Element* newest() noexcept {
        return m_count == 0 ? nullptr : &m_elements[(m_count - 1) % mostKept];
    }
    /// Copies them, oldest first, to an array of mostKept. Returns their number.
    std::size_t copy(Element* out) const {
        const std::size_t kept = std::min(m_count, mostKept);
        for (std::size_t i = 0; i < kept; ++i) {
            out[i] = m_elements[(m_count - kept + i) % mostKept];
        }
        return kept;
    }
    /// Copies them, oldest first.
    std::vector<Element> all() const {
        std::vector<Element> elements(std::min(m_count, mostKept));
        copy(elements.data());
        return elements;
    }

private:
    std::unique_ptr<Element[]> m_elements; ///< mostKept of them, or null
    std::size_t m_count = 0;               ///< noted so far
};

} // namespace zrm

#endif
