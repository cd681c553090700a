#ifndef ZRM_FRAMEWORK_LINKED_LIST_H
#define ZRM_FRAMEWORK_LINKED_LIST_H

#include <cstddef>
#include <vector>

/// A list of elements that it does not own. Not locked: its user guards it.
class LinkedList {
public:
    /// Adds an element at the end.
    void Add(void* element);
    /// Removes the first occurrence of the element; nothing happens when there is none.
    void Remove(void* element);

private:
    friend class LinkedListIter;
    std::vector<void*> m_elements;
};

/// Walks a list from its first element. The list must not change while an iterator walks it.
class LinkedListIter {
public:
    explicit LinkedListIter(LinkedList& list);
    virtual ~LinkedListIter();
    /// Returns the next element, null at the end.
    void* Next();

private:
    LinkedList& m_list;
    std::size_t m_position = 0;
};

#endif
