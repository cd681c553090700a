#ifndef ZRM_HOST_COMPRESSED_GENERATION_H
#define ZRM_HOST_COMPRESSED_GENERATION_H

#include "monitor/GenerationReader.h"

#include <memory>

namespace zrm::host {

/// Reads a generation of a log that was compressed by gzip, bzip2, xz or zstd; for
/// GenerationReader::setOpen. Memory is bounded by what the compression asks for, whatever the
/// size.
std::unique_ptr<GenerationReader> openCompressedGeneration(int descriptor);

} // namespace zrm::host

#endif
