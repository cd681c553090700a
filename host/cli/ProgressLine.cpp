#include "host/cli/ProgressLine.h"

#include <array>
#include <cstdio>
#include <string_view>

#include <unistd.h>

namespace zrm::host {

namespace {

/// Three digits and a unit: "1.23 GB".
std::string sizeText(std::uint64_t bytes) {
    constexpr std::array units = {"B", "kB", "MB", "GB", "TB"};
    auto size = static_cast<double>(bytes);
    std::size_t unit = 0;
    for (; size >= 1000 && unit + 1 < units.size(); ++unit) {
        size /= 1000;
    }
    char text[32];
    const int decimals = unit == 0 || size >= 100 ? 0 : size >= 10 ? 1 : 2;
    std::snprintf(text, sizeof text, "%.*f %s", decimals, size, units[unit]);
    return text;
}

} // namespace

ProgressLine::ProgressLine() : m_isTerminal(isatty(STDERR_FILENO) == 1) {}

void ProgressLine::show(std::uint64_t read, std::uint64_t total, std::size_t entries) {
    if (m_isTerminal) {
        write("reading: " + sizeText(read) + " of " + sizeText(total) + ", " +
              std::to_string(entries) + (entries == 1 ? " entry" : " entries"));
    }
}

void ProgressLine::clear() {
    if (m_width > 0) {
        write("");
        std::fputc('\r', stderr);
        m_width = 0;
    }
}

/// Writes over the last text, with blanks where that was longer.
void ProgressLine::write(const std::string& text) {
    const std::size_t blanks = m_width > text.size() ? m_width - text.size() : 0;
    std::fprintf(stderr, "\r%s%s", text.c_str(), std::string(blanks, ' ').c_str());
    std::fflush(stderr);
    m_width = text.size();
}

} // namespace zrm::host
