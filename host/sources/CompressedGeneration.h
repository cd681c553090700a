#ifndef ZRM_HOST_COMPRESSED_GENERATION_H
#define ZRM_HOST_COMPRESSED_GENERATION_H

#include "monitor/GenerationReader.h"

#include <memory>

namespace zrm::host {

/// Reads a generation of a log that was compressed by gzip, bzip2, xz or zstd; for
/// GenerationReader::setOpen. Takes at most GenerationReader::mostMemory, whatever the size: gzip
/// and bzip2 need little, and zstd refuses larger windows by itself.
std::unique_ptr<GenerationReader> openCompressedGeneration(int descriptor);

} // namespace zrm::host

#endif
