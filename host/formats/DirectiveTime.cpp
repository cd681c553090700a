#include "host/formats/DirectiveTime.h"

#include <algorithm>

namespace zrm::host {

namespace {

constexpr std::string_view field = "time_format";
constexpr std::string_view known =
    "write one of %Y %y %m %d %e %b %B %h %a %A %H %I %k %l %M %S %p "
    "%T %D %F %R %j %s %f %z %Z, or %% for %";

/// The directives that this one stands for: several, or one that is read in the same way. Empty for
/// an unknown directive.
std::string_view meaningOf(char directive) noexcept {
    switch (directive) {
    case 'T':
        return "H:M:S";
    case 'D':
        return "m/d/y";
    case 'F':
        return "Y-m-d";
    case 'R':
        return "H:M";
    case 'e':
        return "d";
    case 'k':
        return "H";
    case 'l':
        return "I";
    case 'h':
    case 'B':
        return "b";
    case 'A':
        return "a";
    default: {
        constexpr std::string_view plain = "YymdbaHIMSpjsfzZ%";
        const std::size_t at = plain.find(directive);
        return at == plain.npos ? std::string_view() : plain.substr(at, 1);
    }
    }
}

bool isBlank(char character) noexcept {
    return character == ' ' || character == '\t';
}

tl::unexpected<Problem> refusedPattern(std::string what, std::string_view cure) {
    return refused(std::move(what), std::string(cure), std::string(field));
}

} // namespace

/// A time while it is read.
class DirectiveTime::Reading {
public:
    Reading(std::string_view text, bool hasDate) noexcept : m_text(text) {
        m_parts.hasDate = hasDate;
    }

    bool take(const Step& step) noexcept {
        if (step.isDirective) {
            return takeDirective(step.character);
        }
        return isBlank(step.character) ? m_text.takeBlanks() : m_text.take(step.character);
    }
    /// The time, once everything has been taken.
    std::optional<TimeParts> finish() noexcept {
        m_text.takeBlanks();
        if (!m_text.atEnd() || (m_hour12 && !m_parts.setHour(*m_hour12, m_isAfternoon)) ||
            (m_dayOfYear && !setDayOfYear())) {
            return std::nullopt;
        }
        return m_parts;
    }

private:
    bool takeDirective(char directive) noexcept {
        CivilTime& civil = m_parts.civil;
        switch (directive) {
        case 'Y':
            return takeYear();
        case 'y':
            return takeShortYear();
        case 'm':
            return takePair(civil.month);
        case 'd':
            return takePair(civil.day);
        case 'b':
            return m_text.takeMonth(civil.month);
        case 'a':
            return m_text.takeWeekday();
        case 'H':
            return takePair(civil.hour);
        case 'I':
            return takePair(m_hour12.emplace());
        case 'M':
            return takePair(civil.minute);
        case 'S':
            return takePair(civil.second);
        case 'p':
            return m_text.takeMeridiem(m_isAfternoon);
        case 'j':
            return m_text.takeNumber(1, 3, m_dayOfYear.emplace());
        case 's':
            return takeEpoch();
        case 'f':
            m_text.takeOneOf(".,");
            return m_text.takeFraction();
        case 'z':
            return m_text.takeZone(m_parts.offset);
        default: // 'Z'
            return m_text.takeZone(m_parts.offset) || m_text.takeWord();
        }
    }
    bool takeYear() noexcept {
        unsigned year = 0;
        const bool isYear = m_text.takeNumber(4, 4, year);
        m_parts.setYear(year);
        return isYear;
    }
    bool takeShortYear() noexcept {
        unsigned year = 0;
        const bool isYear = takePair(year);
        m_parts.setShortYear(year);
        return isYear;
    }
    /// A number of one or two digits, which may be padded with a blank.
    bool takePair(unsigned& number) noexcept {
        m_text.take(' ');
        return m_text.takeNumber(1, 2, number);
    }
    bool takeEpoch() noexcept {
        constexpr std::size_t mostDigits = 11;
        const std::size_t count = m_text.digits();
        if (count == 0 || count > mostDigits) {
            return false;
        }
        std::int64_t seconds = 0;
        for (std::size_t at = 0; at < count; ++at) {
            seconds = seconds * 10 + (m_text.next(at) - '0');
        }
        m_text.skip(count);
        m_parts.civil = CivilTime::of(seconds);
        m_parts.hasYear = true;
        m_parts.offset = 0;
        return true;
    }
    bool setDayOfYear() noexcept {
        constexpr std::int64_t daySeconds = 86'400;
        const CivilTime newYear{.year = m_parts.civil.year};
        const auto day =
            CivilTime::of(newYear.seconds() + (std::int64_t{*m_dayOfYear} - 1) * daySeconds);
        m_parts.civil.month = day.month;
        m_parts.civil.day = day.day;
        return day.year == newYear.year;
    }

    TimeCursor m_text;
    TimeParts m_parts;
    std::optional<unsigned> m_hour12;
    bool m_isAfternoon = false;
    std::optional<unsigned> m_dayOfYear;
};

DirectiveTime::DirectiveTime(std::vector<Step> steps)
    : m_steps(std::move(steps)), m_hasDate(has("s") || (has("mb") && has("d")) || has("j")) {}

bool DirectiveTime::has(std::string_view directives) const noexcept {
    return std::any_of(m_steps.begin(), m_steps.end(), [&](const Step& step) {
        return step.isDirective && directives.find(step.character) != directives.npos;
    });
}

Result<std::shared_ptr<const TimePattern>> DirectiveTime::make(const std::string& pattern) {
    std::vector<Step> steps;
    for (std::size_t at = 0; at < pattern.size(); ++at) {
        if (pattern[at] != '%') {
            steps.push_back({false, pattern[at]});
            continue;
        }
        const std::string_view meaning = meaningOf(++at < pattern.size() ? pattern[at] : '\0');
        if (meaning.empty()) {
            return refusedPattern("'" + pattern.substr(at - 1, 2) + "' is not a directive", known);
        }
        for (const char character : meaning) {
            steps.push_back({TimeCursor::isLetter(character), character});
        }
    }
    // As many blanks as there are count as one.
    const auto isRepeatedBlank = [](const Step& before, const Step& step) {
        return !before.isDirective && !step.isDirective && isBlank(before.character) &&
               isBlank(step.character);
    };
    steps.erase(std::unique(steps.begin(), steps.end(), isRepeatedBlank), steps.end());
    const std::shared_ptr<const DirectiveTime> time(new DirectiveTime(std::move(steps)));
    return time->checked(time);
}

/// The pattern itself, if what it reads is a time.
Result<std::shared_ptr<const TimePattern>>
DirectiveTime::checked(std::shared_ptr<const DirectiveTime> self) const {
    if (has("p") && !has("I")) {
        return refusedPattern("%p says which half of the day an hour of %I is in",
                              "write %I in place of %H");
    }
    if (has("j") && !has("Yy")) {
        return refusedPattern("the day of the year (%j) needs a year", "add %Y");
    }
    if (!m_hasDate && has("Yymbd")) {
        return refusedPattern("the date is not complete",
                              "write month (%m or %b) and day (%d), or neither, nor a year");
    }
    if (!m_hasDate && !has("HI")) {
        return refusedPattern("has no directive for a time", known);
    }
    return self;
}

bool DirectiveTime::read(std::string_view text, EntryColumns& columns) const noexcept {
    Reading reading(text, m_hasDate);
    for (const Step& step : m_steps) {
        if (!reading.take(step)) {
            return false;
        }
    }
    const std::optional<TimeParts> parts = reading.finish();
    return parts && parts->give(columns);
}

} // namespace zrm::host
