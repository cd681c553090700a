#include "agent/framework/TableManager.h"

#include "host/framework/Status.h"
#include "host/framework/Tables.h"

TableManager::TableManager(const char* application, const char* table)
    : m_application(application), m_table(table) {}

TableManager::~TableManager() {
    Tables::remove(this);
}

unsigned TableManager::Shutdown(unsigned /*reason*/) {
    return STATUS_OK;
}

unsigned TableManager::RegisterWithManager(TableManager* manager) {
    return Tables::add(manager);
}
