#ifndef ZRM_HOST_SEEN_FIELDS_H
#define ZRM_HOST_SEEN_FIELDS_H

#include "host/analysis/LogTail.h"
#include "host/base/Result.h"

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>

namespace zrm {
class EntryFields;
class LogFile;
} // namespace zrm

namespace zrm::host {

class JsonWriter;

/// The fields that the entries at the end of a log have. One thread.
class SeenFields {
public:
    static constexpr std::size_t mostNames = 1000;
    static constexpr std::size_t longestExample = 100; ///< bytes

    /// Reads the log's end (LogTail). The log is used only during the call.
    Result<void> read(LogFile& log);

    /// Writes `fields` (the most frequent first), `entries`, `complete`, `reached` and `reason`,
    /// members of an object.
    void write(JsonWriter& json) const;

private:
    struct Field {
        std::uint64_t entries = 0; ///< that have it
        std::string example;       ///< the newest value, maybe its beginning
    };

    void add(const EntryFields& fields);

    std::map<std::string, Field, std::less<>> m_fields; ///< by name
    std::uint64_t m_entries = 0;
    Reach m_reach;
};

} // namespace zrm::host

#endif
