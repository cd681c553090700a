#include "host/base/Say.h"

#include "host/base/PatientWrite.h"
#include "host/base/SteeringText.h"

#include <algorithm>
#include <cstdarg>
#include <cstddef>
#include <cstdio>

namespace zrm::host {

void say(const char* format, ...) {
    char line[8192];
    std::size_t length = static_cast<std::size_t>(std::snprintf(line, sizeof line, "zrmagent: "));
    std::va_list arguments;
    va_start(arguments, format);
    const int added = std::vsnprintf(line + length, sizeof line - length, format, arguments);
    va_end(arguments);
    length = std::min(length + static_cast<std::size_t>(std::max(added, 0)), sizeof line - 1);
    // It may quote a file's name or a receiver's answer.
    char visible[sizeof line];
    length = SteeringText::copyVisible({line, length}, visible, sizeof visible - 1);
    std::replace(visible, visible + length, '\n', ' ');
    visible[length++] = '\n';
    PatientWrite::toStandardError({visible, length});
}

} // namespace zrm::host
