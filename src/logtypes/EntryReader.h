#ifndef ZRM_ENTRY_READER_H
#define ZRM_ENTRY_READER_H

#include "logs/zrm_rmlogent_data.h"

#include <cstddef>
#include <memory>
#include <string_view>

namespace zrm {

class EntryFields;
class LogFile;

/// Makes rows of the entries of a followed log, as its monitor does, but apart from it: it keeps
/// the log's format and settings of its own, takes none of the monitor's locks and counts nothing.
/// One thread.
class EntryReader {
public:
    static constexpr std::size_t stampLength = sizeof zrm_rmlogent_data_t::entrytime;

    /// Null if the log's entries are not in files, or its format cannot be used. The log need not
    /// outlive the reader. Throws std::bad_alloc.
    static std::unique_ptr<EntryReader> of(const LogFile& log);

    EntryReader() = default;
    EntryReader(const EntryReader&) = delete;
    EntryReader& operator=(const EntryReader&) = delete;
    virtual ~EntryReader() = default;

    /// Bytes of a record; 0: the entries are lines.
    virtual std::size_t recordLength() const noexcept { return 0; }
    /// Fills the row from a terminated line, which may be changed, or from a record. `text` is as
    /// of EntryBlock. `newest` (16 characters) is the latest time that the entry may have, give or
    /// take a day: it decides the year of a time without one. False if the entry does not fit the
    /// log's format or has no time.
    virtual bool read(char* entry, std::string_view text, const char* newest,
                      zrm_rmlogent_data_t& row) = 0;
    /// See LogFile::readFields.
    virtual void readFields(std::string_view /*text*/, EntryFields& /*fields*/) {}
};

} // namespace zrm

#endif
