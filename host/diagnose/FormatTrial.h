#ifndef ZRM_HOST_FORMAT_TRIAL_H
#define ZRM_HOST_FORMAT_TRIAL_H

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm {
struct FollowSettings;
}

namespace zrm::host {

/// How a log of a [[log]] table is followed; null for a line of the log configuration.
using TableSettings = std::shared_ptr<const FollowSettings>;

/// A format specifier as the agent gets it from a line of the log configuration: leading blanks are
/// removed, a tab after its first word is a blank, and "${@}" is the log's name. Of the format of a
/// [[log]] table only the latter is replaced. Remembers the original position of each character.
///
/// A specifier that is too long for a line is not expanded: every "${@}" may mean a long name, so
/// its author would decide how much memory the expansion takes.
class ConfiguredFormat {
public:
    enum class Source : unsigned char { line, table };

    /// `log` is the log's path.
    ConfiguredFormat(std::string_view format, std::string_view log, Source source = Source::line);

    /// Length of the configuration line in characters, without its newline; of a table, that of the
    /// format as it is written there.
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
    /// The log's path, and the format as it is written in a [[log]] table.
    const std::string& log() const noexcept { return m_log; }
    const std::string& written() const noexcept { return m_written; }

    /// The most characters of a line of the log configuration, without its newline, and of its
    /// expanded format.
    static constexpr std::size_t mostInLine = 1022;

private:
    void expand(std::size_t begin, Source source);

    std::string m_log;
    std::size_t m_lineLength;
    std::size_t m_length;
    std::string m_written; ///< the specifier without leading blanks
    std::string m_text;
    std::vector<std::size_t> m_original; ///< of each character, and of the end
};

class TrialLog;

/// Tries a format specifier on lines: the agent's own parser learns and scans, so what it says is
/// what monitoring does, of a line of the log configuration or of a [[log]] table; nothing is
/// monitored. Works without an agent; the process's locale counts as the agent's would. One thread
/// at a time.
class FormatTrial {
public:
    /// A learned directive; places are bytes of the format.
    struct Directive {
        std::string text;
        std::size_t from;
        std::size_t to;     ///< behind its last byte
        std::string field;  ///< the name in the format; empty for one that is read and forgotten
        std::string column; ///< the column that it feeds; empty as above
    };
    /// A value in a line; places are bytes of the line.
    struct Field {
        std::size_t from;
        std::size_t to;
        std::string name;
        std::string column;
        std::string value;                    ///< as printed into the column
        std::optional<std::size_t> directive; ///< index of its directive; none in a syslog file
    };
    struct Line {
        std::string line; ///< without its newline
        bool matched = false;
        std::vector<Field> fields; ///< those in front of the failure, too
        /// Column and text, when matched; of a syslog file always.
        std::vector<std::pair<std::string, std::string>> row;
        /// Byte at which it stops fitting; none when all directives fit but there is no row.
        std::optional<std::size_t> failedAt;
        std::optional<std::size_t> directive; ///< index of the one that fails
        std::string reason; ///< why it does not fit; of a line that fits: what its time lacks
    };
    struct Result {
        bool accepted = false;
        std::string reason;                  ///< why the format is refused
        std::optional<std::size_t> position; ///< the byte of the format that is wrong
        std::vector<Directive> directives;
        std::vector<Line> lines;
        std::size_t matched = 0;
        std::string configurationLine; ///< empty when the format is refused, and for a table
        std::string table; ///< the [[log]] table; empty when the format is refused, and for a line
    };

    /// Learns a format as it stands in a configuration line behind its third ';', or in a [[log]]
    /// table with these settings. `log` is the log's path, for the configuration.
    explicit FormatTrial(std::string_view format, std::string_view log = someLog,
                         TableSettings settings = nullptr);
    FormatTrial(const FormatTrial&) = delete;
    FormatTrial& operator=(const FormatTrial&) = delete;
    ~FormatTrial();

    bool isAccepted() const noexcept { return m_result.accepted; }
    /// What there is to say of the format, without lines.
    const Result& result() const noexcept { return m_result; }

    /// Tries one line, given without its newline; of more than 2046 bytes the beginning. The
    /// format must have been accepted.
    Line scan(std::string_view line);

    /// Learns a format and tries it on lines. Of a line of more than 2046 bytes a table takes the
    /// beginning; for the log configuration it becomes several lines, as when it is monitored.
    static Result run(std::string_view format, const std::vector<std::string>& lines,
                      std::string_view log = someLog, const TableSettings& settings = nullptr);
    /// Tries lines as those of a syslog file of a [[log]] table with these settings. A line in no
    /// form that system loggers write does not match, though it gives a row without a time.
    static Result runSyslog(const std::vector<std::string>& lines, std::string_view log,
                            const TableSettings& settings);
    /// Settings of a table with this `timezone`; empty: local time. None if there is no such zone.
    static std::optional<TableSettings> settingsOf(const std::string& timezone);

    /// How many pieces the agent reads a line in.
    static std::size_t piecesOf(std::string_view line) noexcept;
    /// The share of lines that fit, in percent with one decimal; 0 without lines.
    static double percent(const Result& result) noexcept;
    /// A result as the JSON object that the API answers. Where a line is no UTF-8, its places are
    /// those of the text shown.
    static std::string json(const Result& result);

    static constexpr std::string_view someLog = "/path/to/the.log";

private:
    void learn();
    void refuse(std::string reason, std::optional<std::size_t> position);
    void describeDirectives();
    void explain(const char* text, Line& line) const;
    Line scanPiece(std::string piece);

    TableSettings m_settings;
    ConfiguredFormat m_format;
    std::unique_ptr<TrialLog> m_log;
    Result m_result;
};

} // namespace zrm::host

#endif
