#include "host/cli/Terminal.h"

#include <charconv>
#include <cstdlib>
#include <cstring>

#include <langinfo.h>
#include <sys/ioctl.h>
#include <unistd.h>

namespace zrm::host {

namespace {

constexpr std::size_t usualWidth = 80;

const char* sequenceOf(Colour colour) {
    switch (colour) {
    case Colour::GOOD:
        return "\033[32m";
    case Colour::NOTICE:
        return "\033[33m";
    case Colour::BAD:
        return "\033[31m";
    case Colour::FAINT:
        return "\033[2m";
    case Colour::HEADING:
        return "\033[1m";
    case Colour::NONE:
        break;
    }
    return "";
}

std::string_view variable(const char* name) {
    const char* const value = std::getenv(name);
    return value == nullptr ? "" : value;
}

std::size_t terminalWidth() {
    const std::string_view columns = variable("COLUMNS");
    std::size_t width = 0;
    std::from_chars(columns.data(), columns.data() + columns.size(), width);
    if (width > 0) {
        return width;
    }
    struct winsize size {};
    if (ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_col > 0) {
        return size.ws_col;
    }
    return usualWidth;
}

} // namespace

Terminal Terminal::ofStandardOutput() {
    Terminal terminal;
    terminal.isUtf8 = std::strcmp(nl_langinfo(CODESET), "UTF-8") == 0;
    terminal.isTerminal = isatty(STDOUT_FILENO) == 1;
    if (terminal.isTerminal) {
        terminal.width = terminalWidth();
        terminal.hasColours = variable("NO_COLOR").empty() && variable("TERM") != "dumb";
    }
    return terminal;
}

std::string Terminal::coloured(std::string_view text, Colour colour) const {
    if (!hasColours || colour == Colour::NONE) {
        return std::string(text);
    }
    return sequenceOf(colour) + std::string(text) + "\033[0m";
}

} // namespace zrm::host
