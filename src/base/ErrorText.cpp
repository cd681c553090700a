#include "base/ErrorText.h"

#include <string.h>

namespace zrm {

namespace {

// strerror_r has two variants. Overloads accept either one.
[[maybe_unused]] const char* chosenText(int status, const char* buffer) {
    return status == 0 ? buffer : nullptr;
}
[[maybe_unused]] const char* chosenText(const char* text, const char* /*buffer*/) {
    return text;
}

} // namespace

ErrorText::ErrorText(int number) noexcept : m_number(number), m_buffer{} {
    m_text = chosenText(strerror_r(number, m_buffer, sizeof m_buffer), m_buffer);
    if (m_text == nullptr || *m_text == '\0') {
        m_text = "Unknown error";
    }
}

} // namespace zrm
