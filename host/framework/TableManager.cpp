#include "framework/TableManager.h"

#include "host/framework/Audience.h"
#include "host/framework/Status.h"
#include "host/framework/Tables.h"

using namespace zrm::host;

class TableManager::Framework {
public:
    explicit Framework(LinkedList& requests) : audience(requests) {}
    Audience audience;
};

TableManager::TableManager(const char* application, const char* table)
    : m_application(application), m_table(table),
      m_framework(std::make_unique<Framework>(m_requests)) {}

TableManager::~TableManager() {
    Tables::remove(this);
}

unsigned TableManager::Shutdown(unsigned /*reason*/) {
    return Status::ok;
}

LinkedList& TableManager::requestsFor(char* row, unsigned rowSize) {
    return m_framework->audience.of(row, rowSize);
}

unsigned TableManager::RegisterWithManager(TableManager* manager) {
    return Tables::add(manager);
}
