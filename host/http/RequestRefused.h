#ifndef ZRM_HOST_REQUEST_REFUSED_H
#define ZRM_HOST_REQUEST_REFUSED_H

#include "host/http/Refusal.h"

#include <exception>
#include <string>
#include <utility>

namespace zrm::host {

/// Thrown to refuse a request: its refusal becomes the answer.
class RequestRefused : public std::exception {
public:
    explicit RequestRefused(Refusal refusal) : m_refusal(std::move(refusal)) {}
    RequestRefused(int status, Problem problem) : m_refusal(status, std::move(problem)) {}
    RequestRefused(int status, std::string what, std::string field)
        : m_refusal(status, std::move(what), std::move(field)) {}

    const Refusal& refusal() const noexcept { return m_refusal; }
    const Problem& problem() const noexcept { return m_refusal.problem; }
    const char* what() const noexcept override { return m_refusal.problem.what.c_str(); }

private:
    Refusal m_refusal;
};

} // namespace zrm::host

#endif
