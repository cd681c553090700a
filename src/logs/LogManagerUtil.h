#ifndef ZRM_LOG_MANAGER_UTIL_H
#define ZRM_LOG_MANAGER_UTIL_H

#include <cstddef>
#include <cstdio>
#include <ctime>

namespace zrm {

/// Helpers of the log manager.
namespace LogManagerUtil {

/// Opens a file to read ("r") or to append ("a") such that no child process inherits it; null and
/// errno on failure. The caller closes it.
std::FILE* openStream(const char* path, const char* mode);

/// Modification time (seconds since the epoch) of a regular file; 0 when there is no such file.
std::time_t fileLastModified(const char* path);

/// Bytes of a line of a configuration file, with newline and terminator.
inline constexpr int recordSize = 1024;

/// Reads the next record of an open configuration file into `line`, which has recordSize bytes,
/// and returns it without leading white space and newline; null at the end of the file or on an
/// error. Comments, blank lines, lines that are too long and a last line without a newline are
/// passed over. Any thread that owns stream and line.
char* nextRecord(std::FILE* stream, char* line);

/// Returns the next record of a configuration file, without leading white space and newline, or
/// null at its end. The record lies in a process-wide buffer until the next call; while a file is
/// open, `path` only names it in messages. Manager thread only.
char* getNextRec(const char* path);

/// Hexadecimal dump for traces; `out` holds 2 * length + 1 bytes. Always gives the empty text,
/// since the output position is never advanced. Returns `out`.
char* xtoa(char* out, const void* data, std::size_t length);

} // namespace LogManagerUtil

} // namespace zrm

#endif
