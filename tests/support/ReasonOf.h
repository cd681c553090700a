#ifndef ZRM_TESTS_REASON_OF_H
#define ZRM_TESTS_REASON_OF_H

#include "host/base/Result.h"

#include <string>

/// Why a result was refused, as people read it; empty when it was not.
template <class T> std::string reasonOf(const zrm::host::Result<T>& result) {
    return result ? "" : result.error().text();
}

#endif
