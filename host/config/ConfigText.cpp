#include "host/config/ConfigText.h"

#include "host/base/WholeFile.h"
#include "host/config/TomlNesting.h"

#include <cerrno>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm::host {

namespace {

Problem unreadable(int number) {
    return {because("cannot be read", number)};
}

Result<std::string> contentOf(int fd, std::size_t most) {
    struct stat status {};
    if (fstat(fd, &status) != 0) {
        return tl::unexpected(unreadable(errno));
    }
    if (S_ISDIR(status.st_mode)) {
        return tl::unexpected(unreadable(EISDIR));
    }
    if (!S_ISREG(status.st_mode)) {
        return refused("is not a regular file");
    }
    return WholeFile::read(fd, most).map_error(unreadable);
}

} // namespace

Result<std::string> ConfigText::read(const std::string& path, std::size_t most) {
    const int fd = open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (fd == -1) {
        return tl::unexpected(unreadable(errno));
    }
    Result<std::string> content = contentOf(fd, most);
    close(fd);
    return content;
}

std::optional<toml::table> ConfigText::parse(std::string_view text, ConfigProblems& problems) {
    if (const std::optional<unsigned> line = TomlNesting::tooDeepAt(text)) {
        const std::string most = std::to_string(TomlNesting::deepest);
        problems.add(*line, {"names or brackets are nested deeper than " + most,
                             "write at most " + most + " levels"});
        return std::nullopt;
    }
    try {
        return toml::parse(text);
    } catch (const toml::parse_error& error) {
        problems.add(static_cast<unsigned>(error.source().begin.line),
                     {std::string(error.description()), "correct the TOML here"});
        return std::nullopt;
    }
}

} // namespace zrm::host
