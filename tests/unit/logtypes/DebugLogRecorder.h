#ifndef ZRM_TESTS_DEBUG_LOG_RECORDER_H
#define ZRM_TESTS_DEBUG_LOG_RECORDER_H

#include <cstddef>
#include <string>
#include <vector>

/// Keeps what the logs hand to LogFile::writeToDebugLog (linked with --wrap), which still does its
/// own work.
namespace DebugLogRecorder {

/// What one entry hands over.
struct Record {
    std::string entry;
    std::string row; ///< the row's bytes; empty if the entry was rejected
    bool operator==(const Record&) const = default;
};

void clear();
std::vector<Record> records();
/// Waits until at least so many have come and returns them; fewer after the time limit.
std::vector<Record> waitForRecords(std::size_t count, int seconds = 10);

} // namespace DebugLogRecorder

#endif
