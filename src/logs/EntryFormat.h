#ifndef ZRM_ENTRY_FORMAT_H
#define ZRM_ENTRY_FORMAT_H

#include "logs/ZoneTime.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace zrm {

class EntryFields;

/// What a format reads from one entry for its row. Texts are views into the entry or into memory of
/// the reader, valid until its next call. They are not cut to the columns' widths.
struct EntryColumns {
    bool hasTime = false;      ///< a date and a time of day
    bool hasTimeOfDay = false; ///< without hasTime: `time` is a time of day without a date
    bool hasYear = false;
    CivilTime time;                     ///< of a time without an offset: as the log's zone has it
    std::optional<std::int32_t> offset; ///< of the time's zone from UTC in seconds, if it says

    std::string_view system = "";
    std::string_view source = "";
    std::string_view type = "";
    std::string_view entryClass = "";
    std::string_view description = "";
};

/// How the entries of a followed log are taken apart, for the formats that the framework brings.
/// Not changed after it was made: shared by all threads without a lock.
class EntryFormat {
public:
    /// Takes entries apart. Allocates nothing per entry once it has read some. One thread.
    class Reader {
    public:
        Reader() = default;
        Reader(const Reader&) = delete;
        Reader& operator=(const Reader&) = delete;
        virtual ~Reader() = default;

        /// Reads an entry: its text without the line end, of which there are at most
        /// EntryKeep::longestText bytes, or a record. `columns` is empty before the call. Returns
        /// false if the entry does not fit the format, or if it has no time where the format needs
        /// one.
        virtual bool read(std::string_view entry, EntryColumns& columns) = 0;
        /// Adds the fields of an entry; the names and values are views into the entry, into memory
        /// of `fields`, or into that of the reader, where they are valid until its next call.
        /// Called only when somebody asks for them, as a rule for the entry that was read last.
        virtual void readFields(std::string_view entry, EntryFields& fields) = 0;
        /// Why the last entry was not read: a clause such as "it is not a JSON object". Valid until
        /// the next call.
        virtual std::string_view reason() const noexcept = 0;
    };

    EntryFormat() = default;
    EntryFormat(const EntryFormat&) = delete;
    EntryFormat& operator=(const EntryFormat&) = delete;
    virtual ~EntryFormat() = default;

    /// Throws std::bad_alloc.
    virtual std::unique_ptr<Reader> reader() const = 0;
    /// Bytes of a record; 0: the entries are lines.
    virtual std::size_t recordLength() const noexcept { return 0; }
    /// All that decides what the format reads, as a text: formats with equal texts are the same.
    virtual const std::string& definition() const noexcept = 0;
};

} // namespace zrm

#endif
