#ifndef ZRM_ENTRY_SOURCE_H
#define ZRM_ENTRY_SOURCE_H

#include "logs/EntryFormat.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace zrm {

class EntryFields;

/// Where the entries of a log come from that is not a file, such as the journal: the framework
/// brings it with the log's settings. Not changed after it was made: shared by all threads without
/// a lock.
class EntrySource {
public:
    /// The entry that was given last. Texts are valid until the next one. One thread.
    class Entry {
    public:
        Entry() = default;
        Entry(const Entry&) = delete;
        Entry& operator=(const Entry&) = delete;
        virtual ~Entry() = default;

        /// Fills the columns, which are empty before the call. False if the entry does not fit the
        /// format in which it should be. Call it once per entry.
        virtual bool read(EntryColumns& columns) = 0;
        /// Why the entry does not fit it, as a clause. Valid until the next entry.
        virtual std::string_view reason() const noexcept { return {}; }
        /// The whole text, or the first EntryKeep::longestText bytes of a longer one.
        virtual std::string_view text() const noexcept = 0;
        virtual bool isTextCut() const noexcept = 0;
        /// Adds the fields; names and values are views into the text or into memory of `fields`.
        virtual void readFields(EntryFields& fields) = 0;
    };

    /// What the log's owner should know about the reading.
    struct Remark {
        bool isLoss = false; ///< entries were lost, or may have been
        std::string text;    ///< a sentence
    };

    /// Reads entries as they come, each once. A source that fails is tried again after growing
    /// pauses, without end. Begins with one call of startAt, resumeAt or recall.
    class Reading : public Entry {
    public:
        enum class Start : unsigned char { end, beginning };

        virtual void startAt(Start start) = 0;
        /// Begins behind a position that an earlier reading gave.
        virtual void resumeAt(const std::string& position) = 0;
        /// Gives the entries up to a position once more, beginning this long before it; after them
        /// there are none.
        virtual void recall(const std::string& position, std::chrono::seconds period) = 0;

        /// The next entry as a terminated text, which may be changed; null if there is none now.
        virtual char* next() = 0;
        /// Behind the last entry. Empty if the source has no positions, or none yet.
        virtual std::string position() = 0;
        /// The position before the last entry, which was not judged. Reading ends with this call.
        virtual std::string takeBack() = 0;
        /// Waits until there may be entries, and for this long at most.
        virtual void wait(std::chrono::milliseconds most) = 0;
        /// What is wrong at present, as a clause; empty if nothing is.
        virtual const std::string& problem() const noexcept = 0;
        virtual std::optional<Remark> takeRemark() = 0;
    };

    /// Reads entries backwards, for reports.
    class Past : public Entry {
    public:
        /// Begins at the newest entry that is not younger than this, in microseconds since
        /// 1970-01-01 UTC. False if the source cannot be read; problem says why.
        virtual bool begin(std::int64_t newest) = 0;
        /// The next older entry as a terminated text, or null if there is none or the request is
        /// cancelled (CTX1_IsCancelled).
        virtual char* previous() = 0;
        /// Turns round after previous has given entries: next gives the last of them once more, and
        /// then younger ones. False if the source cannot be read; problem says why.
        virtual bool turn() = 0;
        virtual char* next() = 0;
        /// When the source wrote the entry, in microseconds since 1970-01-01 UTC.
        virtual std::int64_t time() const noexcept = 0;
        /// Why not all of it can be read, as a clause; empty if all can.
        virtual const std::string& problem() const noexcept = 0;
    };

    EntrySource() = default;
    EntrySource(const EntrySource&) = delete;
    EntrySource& operator=(const EntrySource&) = delete;
    virtual ~EntrySource() = default;

    /// Throws std::bad_alloc.
    virtual std::unique_ptr<Reading> reading() const = 0;
    /// Null if what was read is gone, so that there are no reports and no positions.
    virtual std::unique_ptr<Past> past() const = 0;
    /// All that decides what is read, as a text: sources with equal texts are the same.
    virtual const std::string& definition() const noexcept = 0;
};

} // namespace zrm

#endif
