#ifndef ZRM_EARLIER_ENTRIES_H
#define ZRM_EARLIER_ENTRIES_H

#include "logs/EntryClock.h"
#include "monitor/EntryBlock.h"
#include "monitor/Generation.h"
#include "monitor/GenerationNames.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm {

class LineJoin;

/// Reads once more the entries of a followed log that lie before a place in one of its files: at
/// least those of the last `period` before the newest of them, in this file and in older
/// generations. Reads only what that needs, and never more than a limit. One thread.
class EarlierEntries {
public:
    static constexpr std::int64_t mostBytes = 64 * 1024 * 1024;
    static constexpr std::chrono::seconds patience{5};

    /// When an entry was written, given with its text as of EntryBlock; none if it does not say so.
    /// May change the entry.
    using TimeOf =
        std::function<std::optional<EntryClock::Range>(char* entry, std::string_view text)>;
    /// Takes an entry, with its text as of EntryBlock. Returns false to end the reading.
    using Take = std::function<bool(char* entry, std::string_view text)>;

    /// `rotatedTo` as in FollowSettings; `recordLength` and `join` as for EntryBlock.
    EarlierEntries(std::string path, std::string rotatedTo, std::size_t recordLength,
                   const LineJoin* join = nullptr)
        : m_path(std::move(path)), m_rotatedTo(std::move(rotatedTo)), m_recordLength(recordLength),
          m_join(join) {}

    /// What these files have behind the positions is left out: it was not judged yet.
    void leaveOutLate(LatePositions late) { m_late = std::move(late); }
    /// Gives the entries of `file` before the offset, and those of older generations before them,
    /// oldest first. There may be further entries before the period among them. Compressed files
    /// are checked first, and left out if they are damaged.
    void read(Generation& file, std::int64_t offset, std::int64_t period, const TimeOf& timeOf,
              const Take& take);

    /// Compressed files that were left out: damaged, or too large to be checked in time.
    const std::vector<std::string>& unread() const noexcept { return m_unread; }

private:
    /// A range of a file.
    struct Part {
        Generation* file;
        std::int64_t from;
        std::int64_t to;
    };

    void findParts(Generation& file, std::int64_t offset, std::int64_t period,
                   const TimeOf& timeOf);
    bool addPart(Generation& file, std::int64_t to, std::int64_t period, const TimeOf& timeOf);
    std::int64_t endOf(const Generation& file) const noexcept;
    std::vector<GenerationFile> olderThan(const Generation& file) const;
    std::int64_t newestTime(Generation& file, std::int64_t to, const TimeOf& timeOf) const;
    bool isBeforePeriod(Generation& file, std::int64_t at, const TimeOf& timeOf) const;
    bool readPart(const Part& part, const Take& take) const;

    const std::string m_path;
    const std::string m_rotatedTo;
    const std::size_t m_recordLength;
    const LineJoin* const m_join;
    std::vector<Part> m_parts; ///< newest first
    std::vector<std::unique_ptr<Generation>> m_older;
    std::optional<std::int64_t> m_periodBegin; ///< the period follows this time
    std::int64_t m_room = mostBytes;           ///< bytes that may still be read
    LatePositions m_late;
    std::vector<std::string> m_unread;
};

} // namespace zrm

#endif
