#ifndef ZRM_LOG_BUFFER_INFO_H
#define ZRM_LOG_BUFFER_INFO_H

#include <cstdint>

namespace zrm {

/// The state of one report that reads a log backwards, block by block. Owned by the log type's
/// report state. The descriptor is positioned at the start of the last block read (right after
/// opening, at the end of the file).
struct _LogBufferInfo {
    char* pBuffer;            ///< the block, owned by the log type
    std::int64_t bytesLeft;   ///< unread bytes before the block
    std::int64_t bufferCount; ///< after a fill, the bytes read; before the next fill, the bytes at
                              ///< the start of the block not yet consumed, which are pushed back
    std::int32_t fd;          ///< the report's descriptor; -1: none
    /// Capacity of pBuffer in bytes, without the terminator; 0: the log's OptimumBlockSize. Another
    /// report may change OptimumBlockSize while this one reads.
    std::int64_t blockSize = 0;
};

} // namespace zrm

#endif
