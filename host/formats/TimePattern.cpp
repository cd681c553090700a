#include "host/formats/TimePattern.h"

#include "host/formats/CommonTime.h"
#include "host/formats/DirectiveTime.h"
#include "host/formats/IsoShape.h"

#include <algorithm>
#include <array>
#include <cstring>

namespace zrm::host {

namespace {

/// Times of a form that has a name.
class NamedTime final : public TimePattern {
public:
    using Form = std::optional<TimeParts> (CommonTime::*)() noexcept;

    explicit NamedTime(Form form, DateOrder order = DateOrder::usual) noexcept
        : m_form(form), m_order(order) {}

    bool readsIso() const noexcept override { return m_form != &CommonTime::epoch; }
    bool read(std::string_view text, EntryColumns& columns) const noexcept override {
        CommonTime time(text, m_order);
        const std::optional<TimeParts> parts = (time.*m_form)();
        return parts && parts->give(columns);
    }

private:
    const Form m_form;
    const DateOrder m_order;
};

struct Name {
    std::string_view name;
    NamedTime::Form form;
    DateOrder order = DateOrder::usual;
};

constexpr std::array names = {Name{"auto", &CommonTime::any},
                              Name{"day-first", &CommonTime::any, DateOrder::dayFirst},
                              Name{"month-first", &CommonTime::any, DateOrder::monthFirst},
                              Name{"year-first", &CommonTime::any, DateOrder::yearFirst},
                              Name{"iso8601", &CommonTime::iso},
                              Name{"epoch", &CommonTime::epoch}};

constexpr std::size_t longestPattern = 256;

void copyTime(const EntryColumns& from, EntryColumns& to) noexcept {
    to.hasTime = from.hasTime;
    to.hasTimeOfDay = from.hasTimeOfDay;
    to.hasYear = from.hasYear;
    to.time = from.time;
    to.offset = from.offset;
}

} // namespace

Result<std::shared_ptr<const TimePattern>> TimePattern::compile(const std::string& pattern) {
    if (pattern.empty()) {
        return common();
    }
    const auto name = std::ranges::find(names, pattern, &Name::name);
    if (name != names.end()) {
        return std::make_shared<const NamedTime>(name->form, name->order);
    }
    if (pattern.size() > longestPattern) {
        return refused("is longer than " + std::to_string(longestPattern) + " bytes",
                       "describe nothing but the time", "time_format");
    }
    if (pattern.find('%') == std::string::npos) {
        return refused(
            "'" + pattern + "' is not the form of a time",
            "write auto, day-first, month-first, year-first, iso8601, epoch, or directives such "
            "as %Y-%m-%d %H:%M:%S",
            "time_format");
    }
    return DirectiveTime::make(pattern);
}

std::shared_ptr<const TimePattern> TimePattern::common() {
    static const auto pattern = std::make_shared<const NamedTime>(&CommonTime::any);
    return pattern;
}

TimeMemo::TimeMemo(std::shared_ptr<const TimePattern> pattern) noexcept
    : m_pattern(std::move(pattern)) {}

bool TimeMemo::read(std::string_view text, EntryColumns& columns) noexcept {
    if (isRemembered(text)) {
        copyTime(m_columns, columns);
        return true;
    }
    if (!m_pattern->read(text, columns)) {
        return false;
    }
    if (text.size() <= sizeof m_text) {
        m_length = text.copy(m_text, sizeof m_text);
        const std::size_t behind = IsoShape::length;
        const bool hasFraction = m_pattern->readsIso() && IsoShape::begins(text) &&
                                 m_length > behind && (text[behind] == '.' || text[behind] == ',');
        m_fraction = hasFraction ? behind + 1 : m_length;
        copyTime(columns, m_columns);
    }
    return true;
}

/// True if the text is the one that is remembered, but for the digits of its fraction.
bool TimeMemo::isRemembered(std::string_view text) const noexcept {
    if (text.empty() || text.size() != m_length ||
        std::memcmp(text.data(), m_text, m_fraction) != 0) {
        return false;
    }
    std::size_t at = m_fraction;
    while (at < m_length && TimeCursor::isDigit(text[at]) && TimeCursor::isDigit(m_text[at])) {
        ++at;
    }
    return std::memcmp(text.data() + at, m_text + at, m_length - at) == 0;
}

} // namespace zrm::host
