#include "host/cli/SseParser.h"

#include "host/cli/CliError.h"

#include <utility>

namespace zrm::host {

namespace {

constexpr std::size_t longestEvent = 1024 * 1024; ///< bytes

} // namespace

SseParser::SseParser(Receiver receiver) : m_receiver(std::move(receiver)) {}

void SseParser::take(std::string_view piece) {
    if (m_line.size() + m_data.size() + piece.size() > longestEvent) {
        throw CliError(CLI_UNREACHABLE, "what answers is not a zrmagent: an event of its stream is "
                                        "longer than 1 MB");
    }
    for (std::size_t end = piece.find('\n'); end != std::string_view::npos;
         end = piece.find('\n')) {
        m_line += piece.substr(0, end);
        piece.remove_prefix(end + 1);
        if (m_line.ends_with('\r')) {
            m_line.pop_back();
        }
        const std::string whole = std::exchange(m_line, {});
        line(whole);
    }
    m_line += piece;
}

void SseParser::line(std::string_view line) {
    if (line.empty()) {
        if (std::exchange(m_hasData, false)) {
            m_receiver(std::exchange(m_data, {}));
        }
        return;
    }
    constexpr std::string_view field = "data:";
    if (!line.starts_with(field)) {
        return; // a comment, or a field that repeats what the data says
    }
    line.remove_prefix(line.starts_with("data: ") ? field.size() + 1 : field.size());
    m_data += m_hasData ? "\n" : "";
    m_data += line;
    m_hasData = true;
}

} // namespace zrm::host
