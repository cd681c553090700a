#ifndef ZRM_HOST_XZ_GENERATION_H
#define ZRM_HOST_XZ_GENERATION_H

#include "monitor/GenerationReader.h"

#include <memory>

namespace zrm::host {

/// True if the file at the descriptor begins as xz does. Does not move the descriptor.
bool isXz(int descriptor) noexcept;

/// As openCompressedGeneration, of a file that xz has compressed. Null with errno: ENOMEM if
/// decompressing it takes more than GenerationReader::mostMemory.
std::unique_ptr<GenerationReader> openXzGeneration(int descriptor);

} // namespace zrm::host

#endif
