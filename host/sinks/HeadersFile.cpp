#include "host/sinks/HeadersFile.h"

#include "host/config/HeaderName.h"
#include "host/sinks/SecretFile.h"

#include <algorithm>
#include <sstream>
#include <string_view>

namespace zrm::host {

namespace {

constexpr const char* blanks = " \t\r";

std::string trimmed(const std::string& text) {
    const std::size_t begin = text.find_first_not_of(blanks);
    return begin == std::string::npos
               ? ""
               : text.substr(begin, text.find_last_not_of(blanks) + 1 - begin);
}

bool isControl(char c) {
    return static_cast<unsigned char>(c) < 0x20 || c == 0x7f;
}

} // namespace

std::optional<HeadersFile::Headers> HeadersFile::read(const std::string& path,
                                                      std::string& problem) {
    const std::optional<std::string> text = SecretFile::read(path, problem);
    if (!text) {
        return std::nullopt;
    }
    Headers headers;
    std::istringstream lines(*text);
    std::string line;
    for (int number = 1; std::getline(lines, line); ++number) {
        const std::string content = trimmed(line);
        if (content.empty() || content.starts_with('#')) {
            continue;
        }
        const std::size_t colon = std::min(content.find(':'), content.size());
        const std::string value = trimmed(content.substr(std::min(colon + 1, content.size())));
        if (colon == content.size() ||
            !isAddableHeader(std::string_view(content).substr(0, colon)) ||
            std::any_of(value.begin(), value.end(), isControl)) {
            problem = path + ':' + std::to_string(number) +
                      ": not a header that can be added; write 'Name: value', a line each";
            return std::nullopt;
        }
        headers[content.substr(0, colon)] = value;
    }
    return headers;
}

} // namespace zrm::host
