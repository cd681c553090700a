#ifndef ZRM_HOST_READER_POOL_H
#define ZRM_HOST_READER_POOL_H

#include "host/history/Database.h"

#include <atomic>
#include <condition_variable>
#include <cstddef>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

namespace zrm::host {

/// Connections for readers of the history, opened on demand and reused. Any thread.
class ReaderPool {
public:
    /// One connection, borrowed for one read.
    class Lease {
    public:
        Lease(ReaderPool& pool, std::unique_ptr<Database> database);
        ~Lease();
        Lease(const Lease&) = delete;
        Lease& operator=(const Lease&) = delete;

        Database& operator*() noexcept { return *m_database; }

    private:
        ReaderPool& m_pool;
        std::unique_ptr<Database> m_database;
    };

    explicit ReaderPool(std::string path);
    ReaderPool(const ReaderPool&) = delete;
    ReaderPool& operator=(const ReaderPool&) = delete;

    /// Waits while the pool is suspended. Throws DatabaseError.
    Lease take();

    /// Waits for all leases to end, closes the connections, and hands out none until resume. Used
    /// before the file is replaced.
    void suspend();
    void resume();

    /// Records that a reader has found the file corrupt; the writer will replace it.
    void noteCorruption() noexcept { m_corrupt.store(true); }
    /// True once after noteCorruption.
    bool takeCorruption() noexcept { return m_corrupt.exchange(false); }

private:
    void giveBack(std::unique_ptr<Database> database);

    const std::string m_path;
    std::atomic<bool> m_corrupt{false};

    std::mutex m_mutex;
    std::condition_variable m_changed;
    std::vector<std::unique_ptr<Database>> m_idle;
    std::size_t m_leased = 0;
    bool m_suspended = false;
};

} // namespace zrm::host

#endif
