#ifndef ZRM_FRAMEWORK_LINKED_LIST_H
#define ZRM_FRAMEWORK_LINKED_LIST_H

#include <cstddef>
#include <cstdint>
#include <vector>

/// A list of elements that it does not own. Not locked: the user guards it.
class LinkedList {
public:
    /// Adds an element at the end.
    void Add(void* element);
    /// Removes the first occurrence of the element. Does nothing if there is none.
    void Remove(void* element);
    /// Removes all elements but keeps the allocated memory.
    void Clear() noexcept;
    /// The last element, or null if the list is empty.
    void* Last() const noexcept;
    /// Changes with every change of the list; never 0.
    std::uint64_t generation() const noexcept { return m_generation; }

private:
    friend class LinkedListIter;
    std::vector<void*> m_elements;
    std::uint64_t m_generation = 1;
};

/// Walks a list from its first element. The list must not change during the walk.
class LinkedListIter {
public:
    explicit LinkedListIter(LinkedList& list);
    virtual ~LinkedListIter();
    /// Returns the next element, or null at the end.
    void* Next();

private:
    LinkedList& m_list;
    std::size_t m_position = 0;
};

#endif
