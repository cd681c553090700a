#include "host/framework/RequestLimit.h"

#include "framework/cancellation.h"

#include <utility>

using namespace zrm::host;

namespace {

thread_local RequestLimit* latest = nullptr;

} // namespace

RequestLimit::RequestLimit(Clock::time_point deadline, std::function<bool()> isUnwanted)
    : m_deadline(deadline), m_isUnwanted(std::move(isUnwanted)),
      m_outer(std::exchange(latest, this)) {}

RequestLimit::~RequestLimit() {
    latest = m_outer;
}

bool RequestLimit::isReached() noexcept {
    m_isReached = m_isReached || Clock::now() >= m_deadline || (m_isUnwanted && m_isUnwanted());
    return m_isReached;
}

RequestLimit* RequestLimit::current() noexcept {
    return latest;
}

bool CTX1_IsCancelled() noexcept {
    return latest != nullptr && latest->isReached();
}
