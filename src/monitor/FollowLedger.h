#ifndef ZRM_FOLLOW_LEDGER_H
#define ZRM_FOLLOW_LEDGER_H

#include "framework/locks.h"
#include "monitor/FileIdentity.h"
#include "monitor/Latest.h"

#include <atomic>
#include <cstdint>
#include <ctime>
#include <optional>
#include <string>
#include <vector>

namespace zrm {

/// Records how a log is followed through its generations: what is read now, what was recovered from
/// copies, what was lost. The log's thread writes, any thread reads. Ordinary lines do not touch
/// it.
class FollowLedger {
public:
    enum class State : std::uint8_t {
        waiting,   ///< nothing has the log's name, and no file is read
        reading,   ///< the file that has the log's name
        finishing, ///< a file that no longer has it; its successors are read after it
        missing,   ///< a file that has lost the name, which nothing has now
        notAFile,  ///< the name is not a regular file's
        taken,     ///< the file that has the name is read as another log (FileOwners)
    };
    struct Failure {
        const char* call; ///< static text: "open", "read", ...
        int number;       ///< errno
        std::timespec since;
        std::string file; ///< path of a generation; empty: the file that has the log's name
        /// Of a log that is not a file: what is wrong, as a clause. There is no call then.
        std::string text{};
    };
    /// Bytes that a truncation removed before they were read, read from a copy.
    struct Recovered {
        std::timespec time;
        std::string source; ///< path of the copy
        std::int64_t from;
        std::int64_t to;
    };
    /// Bytes that were in a file and could not be read.
    struct Lost {
        std::timespec time;
        std::string source; ///< path of the generation that has them; empty: unknown, or gone
        std::int64_t from;
        std::int64_t to; ///< one past the last byte known to have been there; there may be more
        /// Of a log that is not a file: what was lost, as a sentence. No bytes are known then.
        std::string text{};
    };
    /// The file that is read.
    struct Generation {
        FileIdentity identity{};
        std::string path; ///< its name when it was opened
    };
    static constexpr std::size_t mostKept = 16; ///< number of ranges kept (the latest)

    FollowLedger() = default;
    FollowLedger(const FollowLedger&) = delete;
    FollowLedger& operator=(const FollowLedger&) = delete;

    // On the log's thread.

    void setState(State state) noexcept { m_state.store(state, std::memory_order_relaxed); }
    void noteFailure(const char* call, int number, const std::string& file = {});
    /// What is wrong with the source of a log that is not a file.
    void noteProblem(std::string text);
    /// What had failed works again.
    void clearFailure();
    void noteGeneration(const FileIdentity& identity, const std::string& path);
    /// Where the next entry begins, and how many bytes known to be there are not read yet.
    void notePosition(std::int64_t offset, std::int64_t behind) noexcept;
    /// Ranges of one source that follow each other are kept as one.
    void noteRecovered(const std::string& source, std::int64_t from, std::int64_t to);
    void noteLost(std::int64_t from, std::int64_t to, const std::string& source = {});
    /// What a log that is not a file has lost, as a sentence.
    void noteLost(std::string text);
    void noteTruncation() noexcept { m_truncations.fetch_add(1, std::memory_order_relaxed); }
    void noteCut() noexcept { m_cut.fetch_add(1, std::memory_order_relaxed); }

    // On any thread.

    State state() const noexcept { return m_state.load(std::memory_order_relaxed); }
    /// What failed last, if it has not succeeded since.
    std::optional<Failure> failure() const;
    std::optional<Generation> generation() const;
    /// Files that were read, the present one included.
    std::int64_t generations() const noexcept { return m_count.load(std::memory_order_relaxed); }
    std::int64_t position() const noexcept { return m_offset.load(std::memory_order_relaxed); }
    std::int64_t behind() const noexcept { return m_behind.load(std::memory_order_relaxed); }
    std::int64_t recoveredBytes() const noexcept {
        return m_recoveredBytes.load(std::memory_order_relaxed);
    }
    std::int64_t lostBytes() const noexcept { return m_lostBytes.load(std::memory_order_relaxed); }
    /// How often something was lost, the times included at which no byte was known of.
    std::int64_t losses() const noexcept { return m_losses.load(std::memory_order_relaxed); }
    /// How often the file that is read was truncated.
    std::int64_t truncations() const noexcept {
        return m_truncations.load(std::memory_order_relaxed);
    }
    /// Entries of which only the beginning was judged, because they are too long.
    std::int64_t cutEntries() const noexcept { return m_cut.load(std::memory_order_relaxed); }
    /// The latest ranges, oldest first.
    std::vector<Recovered> recovered() const;
    std::vector<Lost> lost() const;

private:
    std::atomic<State> m_state{State::waiting};
    std::atomic<std::int64_t> m_count{0};
    std::atomic<std::int64_t> m_offset{0};
    std::atomic<std::int64_t> m_behind{0};
    std::atomic<std::int64_t> m_recoveredBytes{0};
    std::atomic<std::int64_t> m_lostBytes{0};
    std::atomic<std::int64_t> m_losses{0};
    std::atomic<std::int64_t> m_truncations{0};
    std::atomic<std::int64_t> m_cut{0};
    mutable SYS1_Lock m_lock; ///< guards the members below
    std::optional<Failure> m_failure;
    std::optional<Generation> m_generation;
    Latest<Recovered, mostKept> m_recovered;
    Latest<Lost, mostKept> m_lost;
};

/// The state as a word for people and programs: "waiting", "reading", ...
const char* followStateText(FollowLedger::State state) noexcept;

} // namespace zrm

#endif
