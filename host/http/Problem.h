#ifndef ZRM_HOST_PROBLEM_H
#define ZRM_HOST_PROBLEM_H

#include <string>

namespace zrm::host {

/// Why a request over HTTP is refused: a problem document (application/problem+json).
struct Problem {
    int status;         ///< HTTP status
    std::string detail; ///< what is wrong and how to fix it
    std::string field;  ///< the part of the request that is wrong, for example filters[0].op

    /// The document's JSON text.
    std::string json() const;
};

} // namespace zrm::host

#endif
