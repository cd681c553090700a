#include "host/framework/Tables.h"

#include "framework/TableManager.h"
#include "host/framework/Status.h"

#include <atomic>

namespace zrm::host {

namespace {

// Far more than the agent has. Constant-initialised and without a destructor, since requests may be
// opened while the process exits.
constexpr unsigned maxTables = 16;
std::atomic<TableManager*> g_tables[maxTables];

} // namespace

unsigned Tables::add(TableManager* manager) noexcept {
    if (manager == nullptr) {
        return Status::invalidArgument;
    }
    if (find(manager->table()) != nullptr) {
        return Status::duplicate;
    }
    for (std::atomic<TableManager*>& table : g_tables) {
        TableManager* expected = nullptr;
        if (table.compare_exchange_strong(expected, manager)) {
            return Status::ok;
        }
    }
    return Status::noMemory;
}

void Tables::remove(const TableManager* manager) noexcept {
    for (std::atomic<TableManager*>& table : g_tables) {
        if (table.load() == manager) {
            table.store(nullptr);
        }
    }
}

TableManager* Tables::find(std::string_view table) noexcept {
    for (const std::atomic<TableManager*>& entry : g_tables) {
        TableManager* const manager = entry.load();
        if (manager != nullptr && manager->table() == table) {
            return manager;
        }
    }
    return nullptr;
}

void Tables::clear() noexcept {
    for (std::atomic<TableManager*>& table : g_tables) {
        table.store(nullptr);
    }
}

} // namespace zrm::host
