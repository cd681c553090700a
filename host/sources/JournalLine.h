#ifndef ZRM_HOST_JOURNAL_LINE_H
#define ZRM_HOST_JOURNAL_LINE_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// An entry of a journal, copied so that it can wait for those that continue it.
struct JournalLine {
    static constexpr std::size_t mostData = 64 * 1024; ///< bytes of fields

    /// What tells it apart from others of one journal: the end of its cursor.
    static std::string_view idOf(std::string_view cursor) noexcept;

    /// Adds "NAME=value". False if there is no room for it.
    bool addField(std::string_view field);
    /// Calls `take` with each "NAME=value".
    template <class Take> void forEachField(const Take& take) const {
        std::size_t begin = 0;
        for (const std::size_t end : ends) {
            take(std::string_view(data).substr(begin, end - begin));
            begin = end;
        }
    }
    /// Bytes that it takes.
    std::size_t size() const noexcept {
        return sizeof *this + cursor.size() + writer.size() + message.size() + data.size();
    }

    std::string cursor;
    std::uint64_t time = 0; ///< microseconds since 1970-01-01 UTC
    /// Unit, identifier and process: only lines of one writer are joined.
    std::string writer;
    std::string message;
    bool isCut = false;            ///< the message is longer
    std::string data;              ///< all fields but the message
    std::vector<std::size_t> ends; ///< of the fields in `data`
    std::size_t leftOut = 0;       ///< fields for which there was no room
};

/// What was joined.
struct JournalEntry {
    JournalLine first;
    std::string text; ///< the messages, with newlines between them
};

} // namespace zrm::host

#endif
