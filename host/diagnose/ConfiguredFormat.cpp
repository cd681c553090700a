#include "host/diagnose/ConfiguredFormat.h"

#include <algorithm>

namespace {

constexpr std::string_view kBlanks = "\t ";
constexpr std::string_view kNameToken = "${@}";

} // namespace

ConfiguredFormat::ConfiguredFormat(std::string_view format, std::string_view log) : m_log(log) {
    const std::size_t begin = std::min(format.find_first_not_of(kBlanks), format.size());
    m_written = format.substr(begin);
    std::string configured = m_written;
    const std::size_t firstBlank = configured.find_first_of(kBlanks);
    if (firstBlank != std::string::npos && firstBlank + 1 < configured.size()) {
        configured[firstBlank] = ' ';
    }
    for (std::size_t at = 0; at < configured.size();) {
        const bool isName = configured.compare(at, kNameToken.size(), kNameToken) == 0;
        const std::string_view piece = isName ? log : std::string_view(configured).substr(at, 1);
        m_text += piece;
        m_original.insert(m_original.end(), piece.size(), begin + at);
        at += isName ? kNameToken.size() : 1;
    }
    m_original.push_back(format.size());
}

std::size_t ConfiguredFormat::original(std::size_t position) const {
    return m_original[std::min(position, m_original.size() - 1)];
}
