#ifndef ZRM_HOST_CONFIGURED_FORMAT_H
#define ZRM_HOST_CONFIGURED_FORMAT_H

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

/// A format specifier as the agent gets it when it stands in a line of the log configuration: the
/// blanks in front are gone, a tab behind its first word is a blank, and "${@}" is the log's name.
/// Remembers where each of its characters stood in the original.
class ConfiguredFormat {
public:
    /// `log` is the log's path.
    ConfiguredFormat(std::string_view format, std::string_view log);

    /// What the agent learns.
    const std::string& text() const noexcept { return m_text; }
    /// The place in the original of the character at `position`; behind the end, of the end.
    std::size_t original(std::size_t position) const;
    /// The line of the log configuration, without its newline.
    std::string line() const { return m_log + " ;N ;U ;" + m_written; }

    /// Most characters of a line of the log configuration, without its newline.
    static constexpr std::size_t kMostInLine = 1022;

private:
    std::string m_log;
    std::string m_written; ///< the specifier without the blanks in front
    std::string m_text;
    std::vector<std::size_t> m_original; ///< of each character, and of the end
};

#endif
