#ifndef ZRM_HOST_GZIP_GENERATION_H
#define ZRM_HOST_GZIP_GENERATION_H

#include "monitor/GenerationReader.h"

#include <memory>

namespace zrm::host {

/// True if the file at the descriptor begins as gzip does. Does not move the descriptor.
bool isGzip(int descriptor) noexcept;

/// As openCompressedGeneration, of a file that gzip has compressed, whose checksums are verified.
std::unique_ptr<GenerationReader> openGzipGeneration(int descriptor);

} // namespace zrm::host

#endif
