#ifndef ZRM_HOST_INPUT_FILE_H
#define ZRM_HOST_INPUT_FILE_H

#include <cstddef>
#include <cstdio>
#include <memory>
#include <optional>
#include <string>

namespace zrm::host {

/// A file named on the command line; "-" is standard input. Used by one thread.
class InputFile {
public:
    /// Throws CliError when the file cannot be opened.
    explicit InputFile(const std::string& path);

    /// The next line without its newline, or none after the last. A line of more than mostLine
    /// bytes is returned in parts of that size. Throws CliError when the file cannot be read.
    std::optional<std::string> line();

    /// The rest of the file. Throws CliError when it exceeds mostText bytes or cannot be read.
    std::string text();

    static constexpr std::size_t mostLine = 65536;
    static constexpr std::size_t mostText = 16 * 1024 * 1024;

private:
    void throwIfFailed() const;

    std::string m_path;
    std::unique_ptr<std::FILE, int (*)(std::FILE*)> m_stream;
};

} // namespace zrm::host

#endif
