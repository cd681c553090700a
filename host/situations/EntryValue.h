#ifndef ZRM_HOST_ENTRY_VALUE_H
#define ZRM_HOST_ENTRY_VALUE_H

#include "host/base/Result.h"
#include "host/config/EntryNames.h"
#include "host/framework/Condition.h"
#include "host/framework/RowLayout.h"

#include <cstddef>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace zrm {
class LogEntry;
} // namespace zrm

namespace zrm::host {

class CapturePattern;

/// One entry after the other, from which values are read. A pattern is matched when the first of
/// its captures is read, and only once per entry. Allocates nothing once it has been used, but what
/// RE2 does for captures. One thread at a time.
class EntryReading {
public:
    EntryReading();
    EntryReading(const EntryReading&) = delete;
    EntryReading& operator=(const EntryReading&) = delete;
    ~EntryReading();

    /// Goes on to another entry. `layout` is that of Log Entries. Everything stays valid until the
    /// next call; `entry` is null if the row is all there is.
    void begin(const RowLayout& layout, const char* row, LogEntry* entry) noexcept;

private:
    friend class EntryValue;
    struct Match;

    const Match& match(const CapturePattern& pattern);
    /// None if the entry does not have it.
    std::string_view field(std::string_view name) const;
    const RowColumn& column(std::size_t place) const { return m_layout->columns()[place]; }

    const RowLayout* m_layout = nullptr;
    const char* m_row = nullptr;
    LogEntry* m_entry = nullptr;
    std::vector<Match> m_matches;
    std::size_t m_matched = 0; ///< of m_matches, those of this entry
};

/// A value of entries that a situation reads by its name: a column, a field, or what a condition's
/// pattern has captured. Immutable and cheap to copy.
class EntryValue {
public:
    /// The value in the reading's entry, as the log has it: in its code page, without a column's
    /// padding, empty if the entry has no such field or the capture took no part. Valid until the
    /// reading goes on; the text of a number is in `room`.
    std::string_view read(EntryReading& reading, std::string& room) const;

private:
    friend class EntryValues;
    EntryValue(EntryName name, std::shared_ptr<const CapturePattern> pattern)
        : m_name(std::move(name)), m_pattern(std::move(pattern)) {}

    EntryName m_name;
    std::shared_ptr<const CapturePattern> m_pattern; ///< of a capture
};

/// Makes the values of one situation, which share its patterns.
class EntryValues {
public:
    /// The conditions of the situation must outlive the object, but need not outlive the values.
    explicit EntryValues(const std::vector<Condition>& conditions);
    EntryValues(const EntryValues&) = delete;
    EntryValues& operator=(const EntryValues&) = delete;
    ~EntryValues();

    /// The value of a name, as EntryNames::find understands it.
    Result<EntryValue> compile(std::string_view name);

private:
    const std::vector<Condition>& m_conditions;
    const EntryNames m_names;
    std::vector<std::shared_ptr<CapturePattern>> m_patterns; ///< those that some value uses
};

} // namespace zrm::host

#endif
