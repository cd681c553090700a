#include "framework/LinkedList.h"

#include <algorithm>

void LinkedList::Add(void* element) {
    m_elements.push_back(element);
    ++m_generation;
}

void LinkedList::Remove(void* element) {
    const auto found = std::find(m_elements.begin(), m_elements.end(), element);
    if (found != m_elements.end()) {
        m_elements.erase(found);
        ++m_generation;
    }
}

void LinkedList::Clear() noexcept {
    m_elements.clear();
    ++m_generation;
}

void* LinkedList::Last() const noexcept {
    return m_elements.empty() ? nullptr : m_elements.back();
}

LinkedListIter::LinkedListIter(LinkedList& list) : m_list(list) {}

LinkedListIter::~LinkedListIter() = default;

void* LinkedListIter::Next() {
    return m_position < m_list.m_elements.size() ? m_list.m_elements[m_position++] : nullptr;
}
