#ifndef ZRM_LOG_MANAGER_UTIL_H
#define ZRM_LOG_MANAGER_UTIL_H

#include <cstddef>
#include <cstdio>
#include <ctime>

namespace zrm {

/// Helper functions of the log manager.
namespace LogManagerUtil {

/// Opens a file for reading ("r") or appending ("a"); child processes do not inherit it. Returns
/// null and sets errno on failure. The caller closes it.
std::FILE* openStream(const char* path, const char* mode);

/// The modification time of a regular file in seconds since the epoch, or 0 if it does not exist.
std::time_t fileLastModified(const char* path);

/// Maximum bytes in a line of a configuration file, including newline and terminator.
inline constexpr int recordSize = 1024;

/// Reads the next record of an open configuration file into `line` (recordSize bytes) and returns
/// it without leading white space and newline. Returns null at the end of the file or on an error.
/// Skips comments, blank lines, lines that are too long, and a last line without a newline. Any
/// thread that owns the stream and the line.
char* nextRecord(std::FILE* stream, char* line);

/// Returns the next record of a configuration file, without leading white space and newline, or
/// null at the end of the file. The record stays in a process-wide buffer until the next call.
/// While a file is open, `path` is used in messages only. Manager thread only.
char* getNextRec(const char* path);

/// Hexadecimal dump for traces. `out` has 2 * length + 1 bytes. The result is always empty because
/// the output position never advances. Returns `out`.
char* xtoa(char* out, const void* data, std::size_t length);

/// What xtoa returns for any data. State dumps show it for handles and locks.
inline constexpr const char* handleDump = "";

} // namespace LogManagerUtil

} // namespace zrm

#endif
