#include "host/history/ReaderPool.h"

#include <utility>

namespace zrm::host {

namespace {

constexpr std::size_t mostIdle = 4;

} // namespace

ReaderPool::Lease::Lease(ReaderPool& pool, std::unique_ptr<Database> database)
    : m_pool(pool), m_database(std::move(database)) {}

ReaderPool::Lease::~Lease() {
    m_pool.giveBack(std::move(m_database));
}

ReaderPool::ReaderPool(std::string path) : m_path(std::move(path)) {}

ReaderPool::Lease ReaderPool::take() {
    std::unique_ptr<Database> database;
    {
        std::unique_lock lock(m_mutex);
        m_changed.wait(lock, [&] { return !m_suspended; });
        ++m_leased;
        if (!m_idle.empty()) {
            database = std::move(m_idle.back());
            m_idle.pop_back();
        }
    }
    if (database == nullptr) {
        try {
            database = std::make_unique<Database>(m_path, Database::Use::READ);
        } catch (const DatabaseError&) {
            giveBack(nullptr);
            throw;
        }
    }
    return {*this, std::move(database)};
}

void ReaderPool::giveBack(std::unique_ptr<Database> database) {
    {
        const std::lock_guard guard(m_mutex);
        if (database != nullptr && !m_suspended && m_idle.size() < mostIdle) {
            m_idle.push_back(std::move(database));
        }
        // Closed before it counts as returned: a connection closed later would clean up files that
        // are no longer its own.
        database.reset();
        --m_leased;
    }
    m_changed.notify_all();
}

void ReaderPool::suspend() {
    std::unique_lock lock(m_mutex);
    m_suspended = true;
    m_changed.wait(lock, [&] { return m_leased == 0; });
    m_idle.clear();
}

void ReaderPool::resume() {
    {
        const std::lock_guard guard(m_mutex);
        m_suspended = false;
    }
    m_changed.notify_all();
}

} // namespace zrm::host
