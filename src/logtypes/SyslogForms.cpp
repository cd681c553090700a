#include "logtypes/SyslogForms.h"

#include "logtypes/MonthNames.h"

#include <algorithm>
#include <array>

namespace zrm {

namespace {

constexpr std::string_view repeatNotice = "last message repeated ";
constexpr std::string_view byteOrderMark = "\xEF\xBB\xBF";
constexpr unsigned mostPriority = 191;
constexpr std::array<std::string_view, 24> facilities = {
    "kern",   "user",   "mail",     "daemon", "auth",   "syslog", "lpr",    "news",
    "uucp",   "cron",   "authpriv", "ftp",    "ntp",    "audit",  "alert",  "clock",
    "local0", "local1", "local2",   "local3", "local4", "local5", "local6", "local7"};
constexpr std::array<std::string_view, 8> severities = {"emerg",   "alert",  "crit", "err",
                                                        "warning", "notice", "info", "debug"};
using Characters = std::array<bool, 256>; ///< by code

constexpr Characters setOf(std::string_view members) {
    Characters characters{};
    for (const char member : members) {
        characters[static_cast<unsigned char>(member)] = true;
    }
    return characters;
}

constexpr Characters blanks = setOf(" \t\v\f\r");
constexpr Characters sourceEnds = setOf(": \t\v\f\r");

bool isDigit(char character) {
    return character >= '0' && character <= '9';
}

/// Reads fixed fields from the beginning of a text. After a mismatch nothing matches any more.
class Reader {
public:
    explicit Reader(std::string_view text) : m_rest(text) {}

    /// A number of exactly this many digits.
    unsigned number(std::size_t digits) {
        unsigned value = 0;
        if (m_rest.size() < digits) {
            return fail();
        }
        for (std::size_t at = 0; at < digits; ++at) {
            if (!isDigit(m_rest[at])) {
                return fail();
            }
            value = value * 10 + static_cast<unsigned>(m_rest[at] - '0');
        }
        m_rest.remove_prefix(digits);
        return value;
    }
    bool literal(char character) {
        if (!m_rest.starts_with(character)) {
            fail();
            return false;
        }
        m_rest.remove_prefix(1);
        return true;
    }
    void timeOfDay(CivilTime& time) {
        time.hour = number(2);
        literal(':');
        time.minute = number(2);
        literal(':');
        time.second = number(2);
    }
    unsigned fail() {
        m_isGood = false;
        m_rest = {};
        return 0;
    }
    bool isGood() const { return m_isGood; }
    std::string_view& rest() { return m_rest; }

private:
    std::string_view m_rest;
    bool m_isGood = true;
};

bool isIn(const Characters& set, char character) {
    return set[static_cast<unsigned char>(character)];
}

bool isRepeatNotice(std::string_view text) {
    return !text.empty() && text[0] == repeatNotice[0] && text.starts_with(repeatNotice);
}

std::string_view behind(std::string_view text, std::size_t at) {
    return {text.data() + at, text.size() - at};
}

/// Removes the text up to the next blank, and the blank. Words are short, so a loop is faster than
/// a call; and without a call to this, its callers keep the text in registers.
[[gnu::always_inline]] inline std::string_view takeWord(std::string_view& text) {
    std::size_t end = 0;
    while (end < text.size() && text[end] != ' ') {
        ++end;
    }
    const std::string_view word(text.data(), end);
    text = behind(text, end < text.size() ? end + 1 : end);
    return word;
}

/// Removes the source of a line, with the colon and the blank behind it.
std::string_view takeSource(std::string_view& text) {
    std::size_t end = 0;
    while (end < text.size() && !isIn(sourceEnds, text[end])) {
        ++end;
    }
    const std::string_view source(text.data(), end);
    end += end < text.size() && text[end] == ':' ? 1 : 0;
    end += end < text.size() && isIn(blanks, text[end]) ? 1 : 0;
    text = behind(text, end);
    return source;
}

/// The same for a field of RFC 5424, where "-" means none.
std::string_view takeField(std::string_view& text) {
    const std::string_view word = takeWord(text);
    return word == "-" ? std::string_view() : word;
}

bool readTraditional(std::string_view text, SyslogTime& time) {
    // Mmm dd hh:mm:ss
    time.time.month = text.size() < 4 || text[3] != ' ' ? 0 : MonthNames::number(text.data(), 0);
    if (time.time.month == 0) {
        return false;
    }
    Reader reader(behind(text, 4));
    if (reader.rest().starts_with(' ')) {
        reader.literal(' ');
        time.time.day = reader.number(1);
    } else {
        time.time.day = reader.number(2);
    }
    reader.literal(' ');
    reader.timeOfDay(time.time);
    constexpr int leapYear = 2000; // the year is not known yet
    time.time.year = leapYear;
    if (!reader.isGood() || !time.time.isValid()) {
        return false;
    }
    if (!reader.rest().empty() && !reader.literal(' ')) {
        return false;
    }
    time.form = SyslogTime::Form::traditional;
    time.hasTime = true;
    time.end = text.size() - reader.rest().size();
    return true;
}

bool readIso(std::string_view text, SyslogTime& time) {
    Reader reader(text);
    time.time.year = static_cast<int>(reader.number(4));
    reader.literal('-');
    time.time.month = reader.number(2);
    reader.literal('-');
    time.time.day = reader.number(2);
    reader.literal('T');
    reader.timeOfDay(time.time);
    if (!reader.isGood() || !time.time.isValid()) {
        return false;
    }
    std::string_view& rest = reader.rest();
    if (rest.starts_with('.') || rest.starts_with(',')) {
        const auto end = std::find_if_not(rest.begin() + 1, rest.end(), isDigit);
        rest.remove_prefix(static_cast<std::size_t>(end - rest.begin()));
    }
    time.offset = ZoneTime::takeOffset(rest);
    if (!rest.empty() && !reader.literal(' ')) {
        return false;
    }
    time.form = SyslogTime::Form::iso;
    time.hasTime = true;
    time.hasYear = true;
    time.end = text.size() - rest.size();
    return true;
}

/// The length of "<PRI>"; 0 if the text does not begin with one.
std::size_t priorityLength(std::string_view text) {
    constexpr std::size_t mostDigits = 3;
    if (!text.starts_with('<')) {
        return 0;
    }
    std::size_t end = 1;
    while (end < text.size() && end <= mostDigits && isDigit(text[end])) {
        ++end;
    }
    return end > 1 && end < text.size() && text[end] == '>' ? end + 1 : 0;
}

/// Removes the structured data of RFC 5424 and the blank behind it. All of it, if it has no end.
std::string_view takeStructuredData(std::string_view& text) {
    const std::string_view whole = text;
    if (!text.starts_with('[')) {
        return takeField(text);
    }
    bool isQuoted = false;
    std::size_t at = 0;
    for (; at < text.size(); ++at) {
        const char character = text[at];
        if (isQuoted && character == '\\') {
            ++at;
        } else if (character == '"') {
            isQuoted = !isQuoted;
        } else if (!isQuoted && character == ']' &&
                   (at + 1 == text.size() || text[at + 1] != '[')) {
            ++at;
            break;
        }
    }
    at = std::min(at, text.size());
    text.remove_prefix(at < text.size() && text[at] == ' ' ? at + 1 : at);
    return whole.substr(0, at);
}

SyslogParts splitRfc5424(std::string_view text) {
    SyslogParts parts;
    parts.host = takeField(text);
    parts.source = takeField(text);
    parts.processId = takeField(text);
    parts.messageId = takeField(text);
    parts.data = takeStructuredData(text);
    if (text.starts_with(byteOrderMark)) {
        text.remove_prefix(byteOrderMark.size());
    }
    parts.description = text.empty() ? parts.data : text;
    return parts;
}

} // namespace

std::optional<unsigned> SyslogForms::priority(std::string_view line) noexcept {
    const std::size_t length = priorityLength(line);
    unsigned number = 0;
    for (std::size_t at = 1; at + 1 < length; ++at) {
        number = number * 10 + static_cast<unsigned>(line[at] - '0');
    }
    return length > 0 && number <= mostPriority ? std::optional(number) : std::nullopt;
}

std::string_view SyslogForms::severityOf(unsigned priority) noexcept {
    return severities[priority % severities.size()];
}

std::string_view SyslogForms::facilityOf(unsigned priority) noexcept {
    return facilities[priority / severities.size() % facilities.size()];
}

SyslogStart SyslogForms::start(std::string_view line) noexcept {
    const std::size_t priority = priorityLength(line);
    const bool hasVersion = priority > 0 && behind(line, priority).starts_with("1 ");
    return {hasVersion ? priority + 2 : priority, hasVersion};
}

SyslogTime SyslogForms::recognise(std::string_view line) noexcept {
    const SyslogStart start = SyslogForms::start(line);
    const std::string_view text = behind(line, start.at);
    SyslogTime time;
    if (start.isRfc5424) {
        if (text.starts_with("- ")) {
            time.end = 2;
        } else if (!readIso(text, time)) {
            return {};
        }
        time.form = SyslogTime::Form::rfc5424;
        time.end += start.at;
        return time;
    }
    if (readTraditional(text, time) || readIso(text, time = {})) {
        time.end += start.at;
        return time;
    }
    return {};
}

SyslogParts SyslogForms::split(std::string_view line, const SyslogHead& head) noexcept {
    std::string_view text = behind(line, head.end);
    if (head.form == SyslogHead::Form::rfc5424) {
        return splitRfc5424(text);
    }
    SyslogParts parts;
    if (head.form != SyslogHead::Form::none && !isRepeatNotice(text)) {
        parts.host = takeWord(text);
        if (!isRepeatNotice(text)) {
            parts.source = takeSource(text);
        }
    }
    parts.description = text;
    return parts;
}

int SyslogForms::yearOf(const CivilTime& time, const CivilTime& reference) noexcept {
    constexpr std::int64_t tolerance = 86'400;
    constexpr int mostYears = 8; // 29 February may be that far away
    const std::int64_t latest = reference.seconds() + tolerance;
    CivilTime candidate = time;
    for (candidate.year = reference.year + 1; candidate.year > reference.year - mostYears;
         --candidate.year) {
        if (candidate.isValid() && candidate.seconds() <= latest) {
            return candidate.year;
        }
    }
    return reference.year;
}

} // namespace zrm
