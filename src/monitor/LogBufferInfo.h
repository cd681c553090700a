#ifndef ZRM_LOG_BUFFER_INFO_H
#define ZRM_LOG_BUFFER_INFO_H

#include <cstdint>

namespace zrm {

/// The reading state of one report that reads a log backwards, block by block. Owned by the log
/// type's report state. The descriptor stands at the start of the block last read (at the file's
/// end right after opening).
struct _LogBufferInfo {
    char* pBuffer;            ///< the block, owned by the log type
    std::int64_t bytesLeft;   ///< bytes in front of the block that are still unread
    std::int64_t bufferCount; ///< after a fill the bytes read; before the next one the bytes at
                              ///< the block's start that were not consumed, to be pushed back
    std::int32_t fd;          ///< the report's descriptor; -1: none
    /// Bytes that pBuffer has room for, without the terminator; 0: the log's OptimumBlockSize.
    /// Another report may change that size while this one reads.
    std::int64_t blockSize = 0;
};

} // namespace zrm

#endif
