#include "host/diagnose/FormatTrial.h"

#include "base/TraceScope.h"
#include "host/diagnose/TrialLine.h"
#include "host/framework/TraceCapture.h"
#include "logs/FollowSettings.h"
#include "logs/ValidLog.h"
#include "logs/zrm_rmlogent_data.h"
#include "logtypes/UserLogFile.h"
#include "parser/StringParser.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <memory>
#include <string>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"FormatTrial.cpp"};

} // namespace

/// A user log that is not monitored: its lines become rows as those of a monitored log do. One
/// thread.
class TrialLog : public UserLogFile {
public:
    /// Takes a learned format.
    TrialLog(std::unique_ptr<StringParser> format, const TableSettings& settings)
        : TrialLog(std::move(format), trialLine('U', settings)) {}

    const StringParser& format() const noexcept { return *SPAnchor; }

private:
    TrialLog(std::unique_ptr<StringParser> format, std::unique_ptr<ValidLog> line)
        : UserLogFile(*line, Unmonitored{}) {
        SPAnchor = std::move(format);
    }
};

namespace {

constexpr std::string_view blanks = "\t ";
constexpr std::string_view nameToken = "${@}";
constexpr std::string_view fields = " ;N ;U ;"; ///< between the log and the format

} // namespace

ConfiguredFormat::ConfiguredFormat(std::string_view format, std::string_view log, Source source)
    : m_log(log) {
    const bool isLine = source == Source::line;
    const std::size_t begin =
        isLine ? std::min(format.find_first_not_of(blanks), format.size()) : 0;
    m_written = format.substr(begin);
    m_lineLength = m_written.size() + (isLine ? m_log.size() + fields.size() : 0);
    m_length = m_written.size();
    for (std::size_t at = m_written.find(nameToken); at != std::string::npos;
         at = m_written.find(nameToken, at + nameToken.size())) {
        m_length += m_log.size();
        m_length -= nameToken.size();
    }
    if (!isTooLong()) {
        expand(begin, source);
    }
}

/// `begin` is the offset of the specifier in the original.
void ConfiguredFormat::expand(std::size_t begin, Source source) {
    std::string configured = m_written;
    const std::size_t firstBlank =
        source == Source::line ? configured.find_first_of(blanks) : std::string::npos;
    if (firstBlank != std::string::npos && firstBlank + 1 < configured.size()) {
        configured[firstBlank] = ' ';
    }
    for (std::size_t at = 0; at < configured.size();) {
        const bool isName = configured.compare(at, nameToken.size(), nameToken) == 0;
        const std::string_view piece =
            isName ? std::string_view(m_log) : std::string_view(configured).substr(at, 1);
        m_text += piece;
        m_original.insert(m_original.end(), piece.size(), begin + at);
        at += isName ? nameToken.size() : 1;
    }
    m_original.push_back(begin + configured.size());
}

std::string ConfiguredFormat::tooLong(std::size_t length) {
    return "With each ${@} replaced by the log's name the format has " + std::to_string(length) +
           " characters; it may have 1022. Write the name in fewer places.";
}

std::string ConfiguredFormat::line() const {
    return m_log + std::string(fields) + m_written;
}

std::size_t ConfiguredFormat::original(std::size_t position) const {
    return m_original[std::min(position, m_original.size() - 1)];
}

namespace {

constexpr std::size_t longestPiece = 2047; ///< the most bytes that the agent reads as one line
constexpr std::size_t mostValue = 2048;    ///< bytes of a printed value that are shown
constexpr std::string_view countDirective = "%n";

/// The column for each field name, in the order of the names.
constexpr const char* columnOfField[] = {
    "ENTRYTIME", "ENTRYTIME", "ENTRYTIME", "ENTRYTIME",  "ENTRYTIME", "ENTRYTIME",
    "ENTRYSYS",  "ENTRYSRC",  "ENTRYTYPE", "ENTRYCLASS", "ENTRYDESC", "ENTRYTIME",
};

/// A scan directive in two parts: the literal text before it, and the conversion.
struct Parts {
    explicit Parts(std::string_view directive) {
        std::size_t at = 0;
        while (at < directive.size() && (directive[at] != '%' || directive.substr(at, 2) == "%%")) {
            at += directive[at] == '%' ? 2 : 1;
        }
        literal = directive.substr(0, at);
        conversion = directive.substr(at);
        if (conversion.ends_with(countDirective)) {
            conversion.remove_suffix(countDirective.size());
        }
    }
    std::string_view literal;
    std::string_view conversion;
};

/// Why a line does not match a directive.
std::string mismatch(const StringParser& directive, const StringParser::Place& place,
                     bool isAtEnd) {
    const Parts parts(directive.scanDirective());
    if (!place.isInside) {
        return "The line ends before column " + std::to_string(directive.offset() + 1) +
               ", where this field begins.";
    }
    const std::string where = isAtEnd ? "The line ends here; " : "";
    if (!place.isLiteralMatched) {
        return where + "the text \"" + std::string(parts.literal) +
               "\" of the format is expected here.";
    }
    const char code = parts.conversion.empty() ? '\0' : parts.conversion.back();
    std::string wanted = "a text for " + std::string(parts.conversion);
    if (std::strchr("diouxefg", code) != nullptr && code != '\0') {
        wanted = "a number for " + std::string(parts.conversion);
    } else if (code == ']') {
        wanted = "a character of the set in " + std::string(parts.conversion);
    }
    return where + wanted + " is expected here.";
}

/// Why a format is invalid for which the agent has no message.
std::string refusal(const std::string& format, std::size_t position) {
    if (position >= format.size()) {
        return "The format ends too early: a double quote or the rest of a directive is missing.";
    }
    if (format[position] == '\\' && position + 1 == format.size()) {
        return "The format ends with a backslash: the character behind it and the double quote "
               "that ends the format are missing.";
    }
    return format[position] == '"' ? "The format has no directive between its double quotes."
                                   : "A directive, with the text in front of it, is too long: more "
                                     "than 253 characters.";
}

std::string capitalised(std::string text) {
    if (!text.empty() && text[0] >= 'a' && text[0] <= 'z') {
        text[0] = static_cast<char>(text[0] - 'a' + 'A');
    }
    return text;
}

} // namespace

FormatTrial::FormatTrial(std::string_view format, std::string_view log, TableSettings settings)
    : m_settings(std::move(settings)),
      m_format(format, log,
               m_settings ? ConfiguredFormat::Source::table : ConfiguredFormat::Source::line) {
    TraceScope trace(anchor);
    // A [[log]] table may have a format of several lines.
    const std::size_t lineEnd =
        std::min(m_settings ? std::string_view::npos : format.find('\n'), format.find('\0'));
    if (lineEnd != std::string_view::npos) {
        refuse("A configuration line holds neither line ends nor NUL characters.", lineEnd);
        return;
    }
    if (m_settings && m_format.lineLength() > ConfiguredFormat::mostInLine) {
        refuse("The format has " + std::to_string(m_format.lineLength()) +
                   " bytes; write at most 1022.",
               std::nullopt);
    } else if (m_format.lineLength() > ConfiguredFormat::mostInLine) {
        refuse("The configuration line would have " + std::to_string(m_format.lineLength()) +
                   " characters; the agent reads lines of up to 1022.",
               std::nullopt);
    } else if (m_format.isTooLong()) {
        refuse(ConfiguredFormat::tooLong(m_format.length()), std::nullopt);
    } else {
        learn();
    }
}

FormatTrial::~FormatTrial() {
    const TraceCapture quiet; // destroying the log traces, too
    m_log.reset();
}

void FormatTrial::refuse(std::string reason, std::optional<std::size_t> position) {
    m_result.reason = std::move(reason);
    m_result.position = position;
}

void FormatTrial::learn() {
    TraceScope trace(anchor);
    TraceCapture errors;
    auto format = std::make_unique<StringParser>(m_format.text().c_str(),
                                                 m_settings ? UserLogFile::followedFields()
                                                            : UserLogFile::fields());
    if (format->status() != OBJECT_FORMAT_LEARNED) {
        std::string reason = errors.take();
        const std::size_t position = format->learnedTo();
        refuse(reason.empty() ? refusal(m_format.text(), position) : std::move(reason),
               m_format.original(position));
        return;
    }
    m_log = std::make_unique<TrialLog>(std::move(format), m_settings);
    m_result.accepted = true;
    if (m_settings) {
        m_result.table = tableText(m_format.log(), m_format.written(), m_settings->timezone);
    } else {
        m_result.configurationLine = m_format.line();
    }
    describeDirectives();
}

void FormatTrial::describeDirectives() {
    const StringParser& format = m_log->format();
    std::size_t last = format.learnedTo();
    for (const StringParser* node = format.next(); node != nullptr; node = node->next()) {
        const std::size_t from = last + node->distanceToBegin();
        last += node->distanceToEnd();
        Directive directive{m_format.text().substr(from, last + 1 - from), m_format.original(from),
                            m_format.original(last) + 1, "", ""};
        if (!node->isSuppressed()) {
            directive.field = node->fieldName();
            directive.column = columnOfField[node->printIndex()];
        }
        m_result.directives.push_back(std::move(directive));
    }
}

FormatTrial::Line FormatTrial::scan(std::string_view line) {
    return m_settings ? scanPiece(std::string(line.substr(0, longestPiece - 1)) + '\n')
                      : scanPiece((std::string(line) + '\n').substr(0, longestPiece));
}

/// `piece` is a line as the agent reads it, including its line end, if any.
FormatTrial::Line FormatTrial::scanPiece(std::string piece) {
    TraceScope trace(anchor);
    TraceCapture errors;
    Line line;
    line.line = piece.ends_with('\n') ? piece.substr(0, piece.size() - 1) : piece;
    const auto row = std::make_unique<zrm_rmlogent_data_t>();
    line.matched = m_log->formatEntryAsRow(piece.data(), row.get(), nullptr) == 0;
    std::string messages = errors.take();
    explain(piece.c_str(), line);
    if (line.matched) {
        line.row = entryTexts(*row);
    }
    if (line.matched || line.reason.empty()) {
        line.reason = std::move(messages);
    }
    if (!line.matched && line.reason.empty()) {
        line.reason = "The format prints no field, so that no line gives a row.";
    }
    return line;
}

/// Applies the directives one by one, as the scan does, up to the one that does not match.
void FormatTrial::explain(const char* text, Line& line) const {
    if (text[0] != '\0' && text[1] == '\0') {
        line.failedAt = 0;
        line.reason = "A line without text is skipped.";
        return;
    }
    std::size_t position = 0;
    std::size_t index = 0;
    std::string value(mostValue, '\0');
    for (const StringParser* node = m_log->format().next(); node != nullptr;
         node = node->next(), ++index) {
        const StringParser::Place place = node->locate(text, position);
        if (!place.isMatched) {
            const bool isAtEnd = text[place.value] == '\0' || text[place.value] == '\n';
            line.failedAt = std::min(place.value, line.line.size());
            line.directive = index;
            line.reason = capitalised(mismatch(*node, place, isAtEnd));
            return;
        }
        position = place.end;
        if (!node->isSuppressed()) {
            _FormatBuffer buffer{value.data(), static_cast<long>(value.size())};
            node->printValue(buffer);
            const Directive& directive = m_result.directives[index];
            const std::size_t length = line.line.size(); // a value may include the line end
            line.fields.push_back(
                {std::min(place.value, length), std::min(place.end, length), directive.field,
                 directive.column,
                 value.substr(0, value.size() - static_cast<std::size_t>(buffer.room)), index});
        }
    }
}

FormatTrial::Result FormatTrial::run(std::string_view format, const std::vector<std::string>& lines,
                                     std::string_view log, const TableSettings& settings) {
    TraceScope trace(anchor);
    FormatTrial trial(format, log, settings);
    Result result = trial.result();
    if (!result.accepted) {
        return result;
    }
    for (const std::string& line : lines) {
        if (settings) {
            result.lines.push_back(trial.scan(line));
            result.matched += result.lines.back().matched ? 1 : 0;
            continue;
        }
        const std::string whole = line + '\n';
        for (std::size_t at = 0; at < whole.size(); at += longestPiece) {
            result.lines.push_back(trial.scanPiece(whole.substr(at, longestPiece)));
            result.matched += result.lines.back().matched ? 1 : 0;
        }
    }
    return result;
}

std::size_t FormatTrial::piecesOf(std::string_view line) noexcept {
    return line.size() / longestPiece + 1; // including its line end
}

double FormatTrial::percent(const Result& result) noexcept {
    if (result.lines.empty()) {
        return 0;
    }
    // Rounded down, so 100 means that all lines match.
    return std::floor(1000.0 * static_cast<double>(result.matched) /
                      static_cast<double>(result.lines.size())) /
           10.0;
}

} // namespace zrm::host
