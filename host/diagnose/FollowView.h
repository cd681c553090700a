#ifndef ZRM_HOST_FOLLOW_VIEW_H
#define ZRM_HOST_FOLLOW_VIEW_H

#include <cstdint>
#include <string>
#include <vector>

namespace zrm {
class FollowLedger;
}

namespace zrm::host {

class JsonWriter;

/// A snapshot of how a log of a [[log]] table is followed. Sizes are in bytes, times in
/// milliseconds since 1970-01-01 UTC.
struct FollowView {
    /// Bytes that were recovered or lost, by their place in the file.
    struct Range {
        std::int64_t time;
        std::int64_t from;
        std::int64_t to;
        /// The copy from which they were read, or the generation that holds them and cannot be
        /// read; empty if there is none.
        std::string source;
        std::string text{}; ///< what a log that is not a file has lost, as a sentence
    };

    /// "waiting", "reading", "finishing", "missing", "not a file" or "taken".
    std::string state;
    std::string problem;    ///< what fails at present and is tried again; empty if nothing does
    bool isSource = false;  ///< the log is not a file
    std::string generation; ///< the name that the file had when it was opened; empty: no file
    std::int64_t generations = 0; ///< files that were read, the present one included
    std::int64_t position = 0;    ///< where the next entry begins
    std::int64_t behind = 0;      ///< known to be there and not read yet
    std::int64_t recoveredBytes = 0;
    std::int64_t lostBytes = 0;
    std::int64_t cutEntries = 0;  ///< of which only the beginning was judged
    std::vector<Range> recovered; ///< the latest, oldest first
    std::vector<Range> lost;

    /// Any thread.
    static FollowView of(const FollowLedger& ledger);
    /// As a JSON object; `withRanges` adds "recovered" and "lost".
    void write(JsonWriter& json, bool withRanges) const;
};

} // namespace zrm::host

#endif
