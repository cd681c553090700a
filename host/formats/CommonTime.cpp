#include "host/formats/CommonTime.h"

#include "host/formats/IsoShape.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <initializer_list>

namespace zrm::host {

bool TimeParts::give(EntryColumns& columns) const noexcept {
    if (!civil.isValid() || civil.second == 60) {
        return false;
    }
    columns.hasTime = hasDate;
    columns.hasTimeOfDay = !hasDate;
    columns.hasYear = hasYear;
    columns.time = civil;
    columns.offset = offset;
    return true;
}

std::optional<TimeParts> CommonTime::result(bool isRead) noexcept {
    return isRead ? std::optional(m_parts) : std::nullopt;
}

std::optional<TimeParts> CommonTime::iso() noexcept {
    m_text.takeBlanks();
    return result((takeFixedIso() ? takeFraction(".,") : readIso()) && readTail());
}

std::optional<TimeParts> CommonTime::epoch() noexcept {
    m_text.takeBlanks();
    return result(readEpoch() && readTail());
}

std::optional<TimeParts> CommonTime::any() noexcept {
    m_text.takeBlanks();
    if (m_text.next() == '@') {
        return result(readAtomicLabel() && readTail());
    }
    const bool isNumeric = TimeCursor::isDigit(m_text.next());
    return result((isNumeric ? readNumeric() : readNamed()) && readTail());
}

/// The commonest form, without looking for anything. Takes nothing if it is another one.
bool CommonTime::takeFixedIso() noexcept {
    const char* const text = m_text.rest().data();
    if (!IsoShape::begins(m_text.rest())) {
        return false;
    }
    const auto pair = [text](std::size_t at) {
        return static_cast<unsigned>((text[at] - '0') * 10 + (text[at + 1] - '0'));
    };
    m_parts.setYear(pair(0) * 100 + pair(2));
    m_parts.civil.month = pair(5);
    m_parts.civil.day = pair(8);
    m_parts.civil.hour = pair(11);
    m_parts.civil.minute = pair(14);
    m_parts.civil.second = pair(17);
    m_text.skip(IsoShape::length);
    return true;
}

bool CommonTime::readIso() noexcept {
    switch (m_text.digits()) {
    case 4:
        return m_text.next(4) == '-' && readYearFirst();
    case 8:
        return readCompactDate(true);
    default:
        return readStamp();
    }
}

/// The number of digits at the beginning says which form it can be.
bool CommonTime::readNumeric() noexcept {
    if (takeFixedIso()) {
        return takeFraction(".,");
    }
    switch (m_text.digits()) {
    case 1:
    case 2:
        return readShortFirst();
    case 4:
        return TimeCursor::isDigit(m_text.next(5)) && m_text.next(4) == ' ' ? readMonthAndDay()
                                                                            : readYearFirst();
    case 6:
        return readCompactDate(false);
    case 8:
        return readCompactDate(true);
    case 14:
        return readStamp();
    case 9:
    case 10:
    case 13:
    case 16:
    case 19:
        return readEpoch();
    default:
        return false;
    }
}

/// "2026-11-19 10:00:00", "2026/11/19 10:00:00", "2026-Nov-19 10:00:00", "2026 Nov 19 10:00:00",
/// "2026:11:19-10:00:00".
bool CommonTime::readYearFirst() noexcept {
    unsigned year = 0;
    const char separator = m_text.next(4);
    if (!m_text.takeNumber(4, 4, year) || !m_text.takeOneOf("-/.: ")) {
        return false;
    }
    m_parts.setYear(year);
    return (m_text.takeMonth(m_parts.civil.month) ||
            m_text.takeNumber(1, 2, m_parts.civil.month)) &&
           m_text.take(separator) && m_text.takeNumber(1, 2, m_parts.civil.day) && takeBreak() &&
           readTimeOfDay();
}

/// "20261119T100000", "20261119 10:00:00", "261119 10:00:00".
bool CommonTime::readCompactDate(bool hasCentury) noexcept {
    unsigned year = 0;
    m_text.takeNumber(hasCentury ? 4 : 2, hasCentury ? 4 : 2, year);
    if (hasCentury) {
        m_parts.setYear(year);
    } else {
        m_parts.setShortYear(year);
    }
    return m_text.takeNumber(2, 2, m_parts.civil.month) &&
           m_text.takeNumber(2, 2, m_parts.civil.day) && takeBreak() && readTimeOfDay();
}

/// "20261119100000".
bool CommonTime::readStamp() noexcept {
    unsigned year = 0;
    if (m_text.digits() != 14) {
        return false;
    }
    m_text.takeNumber(4, 4, year);
    m_parts.setYear(year);
    return m_text.takeNumber(2, 2, m_parts.civil.month) &&
           m_text.takeNumber(2, 2, m_parts.civil.day) && readTimeOfDay();
}

/// "1119 10:00:00".
bool CommonTime::readMonthAndDay() noexcept {
    return m_text.takeNumber(2, 2, m_parts.civil.month) &&
           m_text.takeNumber(2, 2, m_parts.civil.day) && m_text.takeBlanks() && readTimeOfDay();
}

/// A time that begins with the name of a weekday or a month, as "Nov 19 10:00:00 2026",
/// "Nov19 10:00:00" and "nov/19/2026 10:00:00" do.
bool CommonTime::readNamed() noexcept {
    if (m_text.takeWeekday()) {
        m_text.take(',');
        m_text.takeBlanks();
    }
    if (TimeCursor::isDigit(m_text.next())) {
        return readNumeric();
    }
    if (!m_text.takeMonth(m_parts.civil.month)) {
        return false;
    }
    m_text.take('.');
    const bool isNumeric = m_text.next() == '/';
    if ((!m_text.take('/') && !m_text.takeBlanks() && !TimeCursor::isDigit(m_text.next())) ||
        !m_text.takeNumber(1, 2, m_parts.civil.day) || m_text.next() == ':' ||
        (isNumeric ? !m_text.take('/') : !takeBreak())) {
        return false;
    }
    unsigned year = 0;
    if (m_text.digits() == 4) {
        m_text.takeNumber(4, 4, year);
        m_parts.setYear(year);
        if (!takeBreak()) {
            return false;
        }
    }
    return readTimeOfDay();
}

/// A time that begins with a number of one or two digits.
bool CommonTime::readShortFirst() noexcept {
    if (m_text.next(1) == ':' || m_text.next(2) == ':') {
        m_parts.hasDate = false;
        return readTimeOfDay();
    }
    unsigned first = 0;
    unsigned second = 0;
    m_hasShortFirst = m_text.digits() == 1;
    m_text.takeNumber(1, 2, first);
    const char separator = m_text.next();
    if (!m_text.takeOneOf("/-. ")) {
        return false;
    }
    if (TimeCursor::isLetter(m_text.next())) {
        return readDayAndMonthName(first);
    }
    if (!m_text.takeNumber(1, 2, second)) {
        return false;
    }
    if (separator != ' ' && m_text.take(separator)) {
        return readThreeNumbers(first, second, separator) && takeBreak() && readTimeOfDay();
    }
    m_parts.civil.month = first;
    m_parts.civil.day = second;
    return separator != ' ' && takeBreak() && readTimeOfDay();
}

/// The rest of "19/Nov/2026:10:00:00", "19 Nov 2026 10:00:00", "19-Nov-26 10:00:00" or
/// "19 Nov 10:00:00".
bool CommonTime::readDayAndMonthName(unsigned day) noexcept {
    unsigned year = 0;
    m_parts.civil.day = day;
    if (!m_text.takeMonth(m_parts.civil.month) ||
        (!m_text.takeOneOf("/-.") && !m_text.takeBlanks())) {
        return false;
    }
    if (m_text.digits() == 4) {
        m_text.takeNumber(4, 4, year);
        m_parts.setYear(year);
        return takeBreak() && readTimeOfDay();
    }
    if (m_text.digits() == 2 && m_text.next(2) != ':') {
        m_text.takeNumber(2, 2, year);
        m_parts.setShortYear(year);
        return takeBreak() && readTimeOfDay();
    }
    return readTimeOfDay();
}

/// Which number is the year, the month and the day in "11/19/2026", "19-11-2026", "19.11.2026",
/// "26/11/19", "26-11-19", "19.11.26" and "11/19/26". Two numbers and the separators have been
/// taken. If the usual order gives no date, the first of the others that does counts.
bool CommonTime::readThreeNumbers(unsigned first, unsigned second, char separator) noexcept {
    const bool hasCentury = m_text.digits() == 4;
    unsigned third = 0;
    if (!m_text.takeNumber(2, 4, third) || (!hasCentury && third > 99)) {
        return false;
    }
    if (m_order != DateOrder::usual) {
        return setDate(m_order, first, second, third);
    }
    const bool isYear = !hasCentury && !m_hasShortFirst && separator != '.';
    if (isYear && setDate(DateOrder::yearFirst, first, second, third)) {
        return true;
    }
    const bool isMonthFirst = separator == '/';
    return setDate(isMonthFirst ? DateOrder::monthFirst : DateOrder::dayFirst, first, second,
                   third) ||
           setDate(isMonthFirst ? DateOrder::dayFirst : DateOrder::monthFirst, first, second,
                   third);
}

/// False if the numbers in this order are no date.
bool CommonTime::setDate(DateOrder order, unsigned first, unsigned second,
                         unsigned third) noexcept {
    constexpr unsigned months = 12;
    constexpr unsigned days = 31;
    constexpr unsigned century = 100;
    const bool isYearFirst = order == DateOrder::yearFirst;
    const unsigned year = isYearFirst ? first : third;
    const unsigned month = order == DateOrder::monthFirst ? first : second;
    const unsigned day = isYearFirst ? third : order == DateOrder::dayFirst ? first : second;
    if (month == 0 || month > months || day == 0 || day > days) {
        return false;
    }
    if (year < century) {
        m_parts.setShortYear(year);
    } else {
        m_parts.setYear(year);
    }
    m_parts.civil.month = month;
    m_parts.civil.day = day;
    return true;
}

/// The size says whether it is seconds, milliseconds, microseconds or nanoseconds: all of them are
/// then before the year 5139.
bool CommonTime::readEpoch() noexcept {
    constexpr std::size_t mostDigits = 19;
    constexpr std::uint64_t latest = 100'000'000'000;
    const std::size_t count = m_text.digits();
    if (count == 0 || count > mostDigits) {
        return false;
    }
    std::uint64_t number = 0;
    for (std::size_t at = 0; at < count; ++at) {
        number = number * 10 + static_cast<unsigned>(m_text.next(at) - '0');
    }
    while (number >= latest) {
        number /= 1000;
    }
    m_text.skip(count);
    m_parts.civil = CivilTime::of(static_cast<std::int64_t>(number));
    m_parts.hasYear = true;
    m_parts.offset = 0;
    m_hasZone = true;
    return takeFraction(".");
}

/// The labels of tai64 and tai64n: "@" and, as sixteen hexadecimal digits, 2^62 plus the seconds
/// since 1970 plus ten, since loggers know of no later leap seconds; eight more are nanoseconds.
bool CommonTime::readAtomicLabel() noexcept {
    constexpr std::size_t seconds = 16;
    constexpr std::size_t whole = 24;
    constexpr std::uint64_t base = (std::uint64_t{1} << 62) + 10;
    constexpr std::uint64_t latest = 100'000'000'000; // in the year 5138
    m_text.skip(1);
    const std::string_view text = m_text.rest();
    const std::size_t digits =
        std::min(text.find_first_not_of("0123456789abcdefABCDEF"), text.size());
    if (digits != seconds && digits != whole) {
        return false;
    }
    std::uint64_t label = 0;
    std::from_chars(text.data(), text.data() + seconds, label, 16);
    if (label < base || label - base > latest) {
        return false;
    }
    m_text.skip(digits);
    m_parts.civil = CivilTime::of(static_cast<std::int64_t>(label - base));
    m_parts.hasYear = true;
    m_parts.offset = 0;
    m_hasZone = true;
    return true;
}

/// A fraction of a second, if one of these marks comes next.
bool CommonTime::takeFraction(std::string_view marks) noexcept {
    return !m_text.takeOneOf(marks) || m_text.takeFraction();
}

/// What stands between a date and a time of day: one character, blanks with or without dashes
/// between them, or the marks between two columns, as in "[2026-11-19][10:00:00]".
bool CommonTime::takeBreak() noexcept {
    for (const std::string_view marks : {"][", "] [", "\",\""}) {
        if (m_text.rest().starts_with(marks)) {
            m_text.skip(marks.size());
            return true;
        }
    }
    if (m_text.takeOneOf("Tt_:-|;")) {
        return true;
    }
    const bool hasComma = m_text.take(',');
    if (!m_text.takeBlanks()) {
        return hasComma;
    }
    for (const std::string_view dash : {"- ", "-- "}) {
        if (m_text.rest().starts_with(dash)) {
            m_text.skip(dash.size());
            break;
        }
    }
    return true;
}

/// "10:00", "10:00:00", "10:00:00.123", "10.00.00,123", "10:00:00:123", "10h00.00", "100000",
/// "1000".
bool CommonTime::readTimeOfDay() noexcept {
    CivilTime& civil = m_parts.civil;
    const std::size_t digits = m_text.digits();
    if (digits == 6 || digits == 4) {
        m_text.takeNumber(2, 2, civil.hour);
        m_text.takeNumber(2, 2, civil.minute);
        m_text.takeNumber(2, 2, civil.second);
        return takeFraction(".,");
    }
    if (!m_text.takeNumber(1, 2, civil.hour)) {
        return false;
    }
    const char separator = m_text.next() == 'h' ? '.' : m_text.next();
    if (!m_text.takeOneOf(":.h") || !m_text.takeNumber(1, 2, civil.minute)) {
        return false;
    }
    if (!m_text.take(separator)) {
        return true;
    }
    if (!m_text.takeNumber(1, 2, civil.second)) {
        return false;
    }
    return takeFraction(".,:");
}

/// Whether what is behind the time of day is the rest of the time, up to the end.
bool CommonTime::readTail() noexcept {
    if (m_text.rest() == "Z" && !m_hasZone) { // as most times end
        m_parts.offset = 0;
        return true;
    }
    for (;;) {
        const bool hasBlanks = m_text.takeBlanks();
        if (m_text.atEnd()) {
            return true;
        }
        unsigned year = 0;
        if (hasBlanks && !m_parts.hasYear && m_parts.hasDate && m_text.digits() == 4) {
            m_text.takeNumber(4, 4, year);
            m_parts.setYear(year);
        } else if (!readTailPart()) {
            return false;
        }
    }
}

bool CommonTime::readTailPart() noexcept {
    bool isAfternoon = false;
    if (!m_hasMeridiem && m_text.takeMeridiem(isAfternoon)) {
        m_hasMeridiem = true;
        return m_parts.setHour(m_parts.civil.hour, isAfternoon);
    }
    if (m_hasZone) {
        return takeRemark();
    }
    m_hasZone = true;
    return m_text.takeZone(m_parts.offset);
}

/// The zone's name behind its offset, in "+01:00[Europe/Berlin]" or "+0100 (CET)".
bool CommonTime::takeRemark() noexcept {
    if (m_text.next() != '[' && m_text.next() != '(') {
        return false;
    }
    const char end = m_text.next() == '[' ? ']' : ')';
    while (!m_text.atEnd() && m_text.next() != end) {
        m_text.skip(1);
    }
    return m_text.take(end);
}

} // namespace zrm::host
