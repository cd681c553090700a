// Lists, locks, table managers and values of the framework's contract.

#include "agent/framework/LinkedList.h"
#include "agent/framework/TableManager.h"
#include "agent/framework/values.h"

#include "TestTables.h"

#include <algorithm>
#include <cstring>

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

void SYS1_GetLock(SYS1_Lock* lock) {
    pthread_mutex_lock(&lock->mutex);
}
void SYS1_ReleaseLock(SYS1_Lock* lock) {
    pthread_mutex_unlock(&lock->mutex);
}

TableManager::TableManager(const char* application, const char* table)
    : m_application(application), m_table(table) {}
TableManager::~TableManager() = default;
unsigned TableManager::Shutdown(unsigned /*reason*/) {
    return 0;
}
unsigned TableManager::RegisterWithManager(TableManager* manager) {
    TestTables::registered().push_back(manager);
    return TestTables::registerStatus();
}

void AGF_CopyUnpad(char* destination, const char* source, int length) {
    while (length > 0 && source[length - 1] == ' ') {
        --length;
    }
    std::memcpy(destination, source, static_cast<std::size_t>(length));
    destination[length] = '\0';
}
