#include "host/framework/TraceCapture.h"

#include "framework/trace.h"

#include <atomic>
#include <cstdio>
#include <new>
#include <utility>

namespace zrm::host {

namespace {

thread_local TraceCapture* t_current = nullptr;
thread_local int t_silences = 0;
std::atomic<int> g_count{0};

} // namespace

TraceCapture::TraceCapture() : m_outer(t_current) {
    t_current = this;
    ++g_count;
    // From now on no source file may use its cached level.
    if (TRC1_Generation.fetch_add(1) + 1 == 0) {
        ++TRC1_Generation;
    }
}

TraceCapture::~TraceCapture() {
    --g_count;
    t_current = m_outer;
}

std::string TraceCapture::take() {
    return std::exchange(m_errors, {});
}

TraceCapture* TraceCapture::current() noexcept {
    return t_current;
}

bool TraceCapture::exists() noexcept {
    return g_count != 0;
}

void TraceCapture::add(const char* format, std::va_list arguments) noexcept {
    char text[4096];
    const int length = std::vsnprintf(text, sizeof text, format, arguments);
    try {
        if (length > 0) {
            m_errors += m_errors.empty() ? "" : " ";
            m_errors += text;
        }
    } catch (const std::bad_alloc&) {
        // Without memory, the answer lacks this reason.
    }
}

} // namespace zrm::host

TRC1_Silence::TRC1_Silence() noexcept {
    ++zrm::host::t_silences;
}

TRC1_Silence::~TRC1_Silence() {
    --zrm::host::t_silences;
}

bool TRC1_Silence::isOn() noexcept {
    return zrm::host::t_silences != 0;
}
