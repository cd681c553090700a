#include "agent/framework/LinkedList.h"

#include <algorithm>

void LinkedList::Add(void* element) {
    m_elements.push_back(element);
}

void LinkedList::Remove(void* element) {
    const auto found = std::find(m_elements.begin(), m_elements.end(), element);
    if (found != m_elements.end()) {
        m_elements.erase(found);
    }
}

LinkedListIter::LinkedListIter(LinkedList& list) : m_list(list) {}

LinkedListIter::~LinkedListIter() = default;

void* LinkedListIter::Next() {
    return m_position < m_list.m_elements.size() ? m_list.m_elements[m_position++] : nullptr;
}
