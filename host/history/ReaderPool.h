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

/// Connections for those who read the history, opened on demand and used again. Any thread.
class ReaderPool {
public:
    /// One connection, for the time of one reading.
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

    /// Waits for every lease to end, closes the connections, and gives none until resume: the file
    /// is about to be exchanged.
    void suspend();
    void resume();

    /// A reader has found the file corrupt; its writer will see to it.
    void noteCorruption() noexcept { m_corrupt.store(true); }
    /// True once after such a finding.
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
