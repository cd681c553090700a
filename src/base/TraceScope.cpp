#include "base/TraceScope.h"

#include <cstdarg>

namespace zrm {

void TraceScope::Record::operator()(const char* format, ...) const noexcept {
    if (m_anchor == nullptr) {
        return;
    }
    std::va_list arguments;
    va_start(arguments, format);
    TRC1_VPrintf(*m_anchor, m_line, format, arguments);
    va_end(arguments);
}

} // namespace zrm
