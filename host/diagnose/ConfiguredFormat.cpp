#include "host/diagnose/ConfiguredFormat.h"

#include <algorithm>

namespace zrm::host {

namespace {

constexpr std::string_view blanks = "\t ";
constexpr std::string_view nameToken = "${@}";
constexpr std::string_view fields = " ;N ;U ;"; ///< between the log and the format

} // namespace

ConfiguredFormat::ConfiguredFormat(std::string_view format, std::string_view log) : m_log(log) {
    const std::size_t begin = std::min(format.find_first_not_of(blanks), format.size());
    m_written = format.substr(begin);
    m_lineLength = m_log.size() + fields.size() + m_written.size();
    m_length = m_written.size();
    for (std::size_t at = m_written.find(nameToken); at != std::string::npos;
         at = m_written.find(nameToken, at + nameToken.size())) {
        m_length += m_log.size();
        m_length -= nameToken.size();
    }
    if (!isTooLong()) {
        expand(begin);
    }
}

/// `begin` is the offset of the specifier in the original.
void ConfiguredFormat::expand(std::size_t begin) {
    std::string configured = m_written;
    const std::size_t firstBlank = configured.find_first_of(blanks);
    if (firstBlank != std::string::npos && firstBlank + 1 < configured.size()) {
        configured[firstBlank] = ' ';
    }
    for (std::size_t at = 0; at < configured.size();) {
        const bool isName = configured.compare(at, nameToken.size(), nameToken) == 0;
        const std::string_view piece =
            isName ? std::string_view(m_log) : std::string_view(configured).substr(at, 1);
        m_text += piece;
        m_original.insert(m_original.end(), piece.size(), begin + at);
        at += isName ? nameToken.size() : 1;
    }
    m_original.push_back(begin + configured.size());
}

std::string ConfiguredFormat::tooLong(std::size_t length) {
    return "With each ${@} replaced by the log's name the format has " + std::to_string(length) +
           " characters; it may have 1022. Write the name in fewer places.";
}

std::string ConfiguredFormat::line() const {
    return m_log + std::string(fields) + m_written;
}

std::size_t ConfiguredFormat::original(std::size_t position) const {
    return m_original[std::min(position, m_original.size() - 1)];
}

} // namespace zrm::host
