#ifndef ZRM_HOST_REFUSAL_H
#define ZRM_HOST_REFUSAL_H

#include "host/base/Result.h"

#include <string>
#include <utility>

namespace zrm::host {

/// Why a request over HTTP is refused, and the status that says so.
struct Refusal {
    int status;      ///< of HTTP
    Problem problem; ///< its field is the part of the request that is wrong

    Refusal(int code, Problem reason) : status(code), problem(std::move(reason)) {}
    Refusal(int code, std::string what, std::string field)
        : Refusal(code, Problem{std::move(what), "", std::move(field)}) {}

    /// The problem document (application/problem+json) for the client.
    std::string json() const;
};

} // namespace zrm::host

#endif
