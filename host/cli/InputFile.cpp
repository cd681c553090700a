#include "host/cli/InputFile.h"

#include "host/base/Result.h"
#include "host/cli/CliError.h"

#include <cerrno>

namespace zrm::host {

namespace {

int leaveOpen(std::FILE*) {
    return 0;
}

[[noreturn]] void fail(const std::string& path, int number) {
    throw CliError(number == EACCES ? CliStatus::FORBIDDEN : CliStatus::USAGE,
                   because("cannot read " + path, number));
}

} // namespace

InputFile::InputFile(const std::string& path) : m_path(path), m_stream(stdin, &leaveOpen) {
    if (path != "-") {
        m_stream = {std::fopen(path.c_str(), "re"), &std::fclose};
    }
    if (m_stream == nullptr) {
        fail(m_path, errno);
    }
}

void InputFile::throwIfFailed() const {
    if (std::ferror(m_stream.get()) != 0) {
        fail(m_path, errno);
    }
}

std::optional<std::string> InputFile::line() {
    std::string line;
    int character = EOF;
    while (line.size() < mostLine && (character = std::getc(m_stream.get())) != EOF &&
           character != '\n') {
        line += static_cast<char>(character);
    }
    throwIfFailed();
    if (character == EOF && line.empty()) {
        return std::nullopt;
    }
    return line;
}

std::string InputFile::text() {
    std::string text;
    int character = EOF;
    while ((character = std::getc(m_stream.get())) != EOF) {
        if (text.size() == mostText) {
            throw CliError(CliStatus::USAGE,
                           m_path + " is larger than 16 MiB, the most that is read");
        }
        text += static_cast<char>(character);
    }
    throwIfFailed();
    return text;
}

} // namespace zrm::host
