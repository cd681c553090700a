#ifndef ZRM_FRAMEWORK_CANCELLATION_H
#define ZRM_FRAMEWORK_CANCELLATION_H

/// True when the request on which the calling thread works is to end early: who asked has left, its
/// time is over, or the process ends. False on a thread that works on no request. Cheap enough for
/// every block that is read.
bool CTX1_IsCancelled() noexcept;

#endif
