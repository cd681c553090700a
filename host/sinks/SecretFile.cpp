#include "host/sinks/SecretFile.h"

#include "host/base/WholeFile.h"
#include "host/config/SinkTypes.h"

#include <algorithm>
#include <cerrno>
#include <sstream>
#include <string_view>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm::host {

namespace {

constexpr std::size_t longestSecret = 4096; ///< bytes

Result<std::string> contentOf(int fd, const std::string& path) {
    const auto notASecret = [&] {
        return refused(path + " is not a file with a secret of 1 to " +
                       std::to_string(longestSecret) + " bytes");
    };
    struct stat status {};
    if (fstat(fd, &status) != 0) {
        return refused(because("cannot read " + path, errno));
    }
    if (!S_ISREG(status.st_mode)) {
        return notASecret();
    }
    Result<std::string, int> text = WholeFile::read(fd, longestSecret + 1);
    if (!text && text.error() != EFBIG) {
        return refused(because("cannot read " + path, text.error()));
    }
    if ((status.st_mode & S_IRWXO) != 0) {
        return refused(path +
                       " is accessible to every user: remove the permissions of other users "
                       "(chmod o= " +
                       path + ')');
    }
    if (text && text->ends_with('\n')) {
        text->pop_back();
    }
    if (!text || text->empty() || text->size() > longestSecret) {
        return notASecret();
    }
    return std::move(*text);
}

} // namespace

Result<std::string> SecretFile::read(const std::string& path) {
    // Non-blocking: a named pipe can be distinguished from a file only after opening it.
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    if (fd == -1) {
        return refused(because("cannot read " + path, errno));
    }
    Result<std::string> content = contentOf(fd, path);
    ::close(fd);
    return content;
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

Result<HeadersFile::Headers> HeadersFile::read(const std::string& path) {
    const Result<std::string> text = SecretFile::read(path);
    if (!text) {
        return tl::unexpected(text.error());
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
            return refused(path + ':' + std::to_string(number) + ": not a header that can be added",
                           "write 'Name: value', a line each");
        }
        headers[content.substr(0, colon)] = value;
    }
    return headers;
}

} // namespace zrm::host
