#include "host/sinks/SecretFile.h"

#include "base/ErrorText.h"
#include "host/config/SinkTypes.h"

#include <algorithm>
#include <cerrno>
#include <sstream>
#include <string_view>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm::host {

namespace {

constexpr std::size_t longestSecret = 4096; ///< bytes

/// The contents of an open file, or enough of it to show that it is too long.
std::optional<std::string> content(int fd) {
    std::string text;
    char buffer[1024];
    ssize_t count = 0;
    while (text.size() <= longestSecret && (count = ::read(fd, buffer, sizeof buffer)) > 0) {
        text.append(buffer, static_cast<std::size_t>(count));
    }
    return count == -1 ? std::nullopt : std::optional(std::move(text));
}

} // namespace

std::optional<std::string> SecretFile::read(const std::string& path, std::string& problem) {
    // Non-blocking: a named pipe can be distinguished from a file only after opening it.
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    struct stat status {};
    std::optional<std::string> text;
    if (fd == -1 || fstat(fd, &status) != 0 || (S_ISREG(status.st_mode) && !(text = content(fd)))) {
        problem = "cannot read " + path + ": " + ErrorText(errno).text();
    }
    if (fd == -1) {
        return std::nullopt;
    }
    ::close(fd);
    if (problem.empty() && text && (status.st_mode & S_IRWXO) != 0) {
        problem = path +
                  " is accessible to every user: remove the permissions of other users (chmod o= " +
                  path + ')';
        return std::nullopt;
    }
    if (text && text->ends_with('\n')) {
        text->pop_back();
    }
    if (problem.empty() && (!text || text->empty() || text->size() > longestSecret)) {
        problem = path + " is not a file with a secret of 1 to " + std::to_string(longestSecret) +
                  " bytes";
        return std::nullopt;
    }
    return text;
}

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
