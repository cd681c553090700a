#include "host/diagnose/LastLines.h"

#include <algorithm>
#include <cerrno>
#include <string_view>

#include <sys/stat.h>
#include <unistd.h>

namespace zrm::host {

namespace {

/// The bytes from an offset on, as many as there are; none, with errno set, on an error.
std::optional<std::string> readFrom(int fd, off_t offset, std::size_t size) {
    std::string text(size, '\0');
    std::size_t length = 0;
    while (length < size) {
        const ssize_t count =
            ::pread(fd, text.data() + length, size - length, offset + static_cast<off_t>(length));
        if (count < 0 && errno == EINTR) {
            continue;
        }
        if (count < 0) {
            return std::nullopt;
        }
        if (count == 0) {
            break; // the file was truncated
        }
        length += static_cast<std::size_t>(count);
    }
    text.resize(length);
    return text;
}

} // namespace

std::optional<std::vector<std::string>> LastLines::read(int descriptor, std::size_t count,
                                                        std::size_t byteLimit) {
    struct stat status;
    if (::fstat(descriptor, &status) != 0) {
        return std::nullopt;
    }
    const auto size = std::min(static_cast<std::size_t>(status.st_size), byteLimit);
    const off_t offset = status.st_size - static_cast<off_t>(size);
    const std::optional<std::string> text = readFrom(descriptor, offset, size);
    if (!text) {
        return std::nullopt;
    }
    std::string_view rest = *text;
    if (rest.ends_with('\n')) {
        rest.remove_suffix(1);
    } else if (rest.empty()) {
        return std::vector<std::string>();
    }
    std::vector<std::string> lines;
    while (lines.size() < count) {
        const std::size_t before = rest.rfind('\n');
        if (before == std::string_view::npos) {
            if (offset == 0) { // otherwise the beginning of the line was not read
                lines.emplace_back(rest);
            }
            break;
        }
        lines.emplace_back(rest.substr(before + 1));
        rest.remove_suffix(rest.size() - before);
    }
    std::reverse(lines.begin(), lines.end());
    return lines;
}

} // namespace zrm::host
