#ifndef ZRM_FRAMEWORK_CANCELLATION_H
#define ZRM_FRAMEWORK_CANCELLATION_H

/// True if the request that the calling thread works on should end early: the client has
/// disconnected, the request timed out, or the process is ending. False on a thread without a
/// request. Cheap enough to call for every block read.
bool CTX1_IsCancelled() noexcept;

#endif
