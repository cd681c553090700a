#ifndef ZRM_HOST_COMMON_TIME_H
#define ZRM_HOST_COMMON_TIME_H

#include "host/formats/TimeCursor.h"
#include "logs/EntryFormat.h"

#include <optional>
#include <string_view>

namespace zrm::host {

/// What a text says about the time of an entry.
struct TimeParts {
    CivilTime civil{.year = yearless};
    bool hasYear = false;
    bool hasDate = true; ///< false: the time of day is all there is
    std::optional<std::int32_t> offset;

    /// Has a 29 February.
    static constexpr int yearless = 2000;

    void setYear(unsigned year) noexcept {
        civil.year = static_cast<int>(year);
        hasYear = true;
    }
    /// Of a year of two digits: from 1969 to 2068.
    void setShortYear(unsigned year) noexcept { setYear(year + (year < 69 ? 2000 : 1900)); }
    /// The hour of a clock of twelve hours. Returns false if it shows no such hour.
    bool setHour(unsigned hour, bool isAfternoon) noexcept {
        civil.hour = hour % 12 + (isAfternoon ? 12 : 0);
        return hour >= 1 && hour <= 12;
    }
    /// Sets the time of the columns, or the time of day alone, if these parts form a valid one;
    /// returns whether they do.
    bool give(EntryColumns& columns) const noexcept;
};

/// What the first of three numbers such as "03/04/26" is. "usual" goes by the separator and by
/// which numbers can be a month.
enum class DateOrder : unsigned char { usual, dayFirst, monthFirst, yearFirst };

/// Reads a time whose form is not known, from the whole of a text. Looks at each character about
/// once.
class CommonTime {
public:
    explicit CommonTime(std::string_view text, DateOrder order = DateOrder::usual) noexcept
        : m_text(text), m_order(order) {}

    /// Of each of these, if it is the time: a form of ISO 8601, seconds and so on since 1970, any
    /// usual form.
    std::optional<TimeParts> iso() noexcept;
    std::optional<TimeParts> epoch() noexcept;
    std::optional<TimeParts> any() noexcept;

private:
    bool takeFixedIso() noexcept;
    bool readIso() noexcept;
    bool readNumeric() noexcept;
    bool readYearFirst() noexcept;
    bool readCompactDate(bool hasCentury) noexcept;
    bool readStamp() noexcept;
    bool readMonthAndDay() noexcept;
    bool readNamed() noexcept;
    bool readShortFirst() noexcept;
    bool readDayAndMonthName(unsigned day) noexcept;
    bool readThreeNumbers(unsigned first, unsigned second, char separator) noexcept;
    bool setDate(DateOrder order, unsigned first, unsigned second, unsigned third) noexcept;
    bool readEpoch() noexcept;
    bool readAtomicLabel() noexcept;
    bool takeFraction(std::string_view marks) noexcept;
    bool takeBreak() noexcept;
    bool readTimeOfDay() noexcept;
    bool readTail() noexcept;
    bool readTailPart() noexcept;
    bool takeRemark() noexcept;
    std::optional<TimeParts> result(bool isRead) noexcept;

    TimeCursor m_text;
    const DateOrder m_order;
    TimeParts m_parts;
    bool m_hasMeridiem = false;
    bool m_hasZone = false;
    bool m_hasShortFirst = false; ///< the first number of the date has one digit
};

} // namespace zrm::host

#endif
