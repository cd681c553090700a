#ifndef ZRM_HOST_WHOLE_FILE_H
#define ZRM_HOST_WHOLE_FILE_H

#include "host/base/Result.h"

#include <cstddef>
#include <string>
#include <string_view>

namespace zrm::host {

/// Files that are read and written in one go. What fails is the errno of the call.
namespace WholeFile {

/// What an open file holds from its position on; EFBIG when that is more than `most` bytes.
Result<std::string, int> read(int fd, std::size_t most);

/// Writes the text to an open file, and to the disk.
Result<void, int> write(int fd, std::string_view text);

} // namespace WholeFile

} // namespace zrm::host

#endif
