#ifndef ZRM_HOST_REQUEST_REFUSED_H
#define ZRM_HOST_REQUEST_REFUSED_H

#include "host/http/Problem.h"

#include <exception>
#include <string>
#include <utility>

namespace zrm::host {

/// Thrown to refuse a request: its problem becomes the answer.
class RequestRefused : public std::exception {
public:
    explicit RequestRefused(Problem problem) : m_problem(std::move(problem)) {}
    RequestRefused(int status, std::string detail, std::string field)
        : m_problem{status, std::move(detail), std::move(field)} {}

    const Problem& problem() const noexcept { return m_problem; }
    const char* what() const noexcept override { return m_problem.detail.c_str(); }

private:
    Problem m_problem;
};

} // namespace zrm::host

#endif
