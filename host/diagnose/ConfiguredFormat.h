#ifndef ZRM_HOST_CONFIGURED_FORMAT_H
#define ZRM_HOST_CONFIGURED_FORMAT_H

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// A format specifier as the agent gets it when it stands in a line of the log configuration: the
/// blanks in front are gone, a tab behind its first word is a blank, and "${@}" is the log's name.
/// Remembers where each of its characters stood in the original.
///
/// One that is too long for a line is not expanded: what it would take is decided by whoever wrote
/// it, since every "${@}" may stand for a long name.
class ConfiguredFormat {
public:
    /// `log` is the log's path.
    ConfiguredFormat(std::string_view format, std::string_view log);

    /// Characters of the line of the log configuration, without its newline.
    std::size_t lineLength() const noexcept { return m_lineLength; }
    /// Characters of what the agent learns, also where it is too long.
    std::size_t length() const noexcept { return m_length; }
    bool isTooLong() const noexcept { return m_lineLength > mostInLine || m_length > mostInLine; }

    /// Why a format that has so many characters once it has the log's name is refused.
    static std::string tooLong(std::size_t length);
    /// What the agent learns; empty when it is too long.
    const std::string& text() const noexcept { return m_text; }
    /// The place in the original of the character at `position`; behind the end, of the end.
    std::size_t original(std::size_t position) const;
    /// The line of the log configuration, without its newline.
    std::string line() const;

    /// Most characters of a line of the log configuration, without its newline, and of the format
    /// in it once it has the log's name.
    static constexpr std::size_t mostInLine = 1022;

private:
    void expand(std::size_t begin);

    std::string m_log;
    std::size_t m_lineLength;
    std::size_t m_length;
    std::string m_written; ///< the specifier without the blanks in front
    std::string m_text;
    std::vector<std::size_t> m_original; ///< of each character, and of the end
};

} // namespace zrm::host

#endif
