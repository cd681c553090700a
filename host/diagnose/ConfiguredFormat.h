#ifndef ZRM_HOST_CONFIGURED_FORMAT_H
#define ZRM_HOST_CONFIGURED_FORMAT_H

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// A format specifier as the agent gets it from a line of the log configuration: leading blanks are
/// removed, a tab after its first word is a blank, and "${@}" is the log's name. Remembers the
/// original position of each character.
///
/// A specifier that is too long for a line is not expanded: since every "${@}" may stand for a long
/// name, its author would decide how much memory that takes.
class ConfiguredFormat {
public:
    /// `log` is the log's path.
    ConfiguredFormat(std::string_view format, std::string_view log);

    /// Length of the configuration line in characters, without its newline.
    std::size_t lineLength() const noexcept { return m_lineLength; }
    /// Length of the expanded format in characters, even if it is too long.
    std::size_t length() const noexcept { return m_length; }
    bool isTooLong() const noexcept { return m_lineLength > mostInLine || m_length > mostInLine; }

    /// Why a format of this expanded length is refused.
    static std::string tooLong(std::size_t length);
    /// The expanded format; empty when it is too long.
    const std::string& text() const noexcept { return m_text; }
    /// The original position of the character at `position`; past the end, that of the end.
    std::size_t original(std::size_t position) const;
    /// The line of the log configuration, without its newline.
    std::string line() const;

    /// The most characters of a line of the log configuration, without its newline, and of its
    /// expanded format.
    static constexpr std::size_t mostInLine = 1022;

private:
    void expand(std::size_t begin);

    std::string m_log;
    std::size_t m_lineLength;
    std::size_t m_length;
    std::string m_written; ///< the specifier without leading blanks
    std::string m_text;
    std::vector<std::size_t> m_original; ///< of each character, and of the end
};

} // namespace zrm::host

#endif
