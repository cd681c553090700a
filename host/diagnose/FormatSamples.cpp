#include "host/diagnose/FormatSamples.h"

#include "base/EntryFields.h"
#include "host/config/ReadyFormats.h"
#include "host/diagnose/FormatFit.h"
#include "host/formats/EntryColumn.h"

#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::size_t mostShown = 200; ///< bytes of a text in a failure

std::string quoted(std::string_view text) {
    return '"' + std::string(text.substr(0, mostShown)) +
           (text.size() > mostShown ? "...\"" : "\"");
}

/// The time as samples write it; empty if there is none.
std::string timeOf(const EntryColumns& columns) {
    if (!columns.hasTime) {
        return {};
    }
    const CivilTime& time = columns.time;
    char text[48];
    std::snprintf(text, sizeof text, "-%02u-%02uT%02u:%02u:%02u", time.month, time.day, time.hour,
                  time.minute, time.second);
    std::string whole = (columns.hasYear ? std::to_string(time.year) : "-") + text;
    if (columns.offset) {
        const std::int32_t minutes = *columns.offset / 60;
        std::snprintf(text, sizeof text, "%c%02d:%02d", minutes < 0 ? '-' : '+',
                      std::abs(minutes) / 60, std::abs(minutes) % 60);
        whole += text;
    }
    return whole;
}

class SampleCheck {
public:
    SampleCheck(const FormatDescription& description, const EntryFormat& format,
                const LineJoin* join)
        : m_description(description), m_reader(format.reader()), m_join(join) {}

    std::vector<SampleFailure> take() { return std::move(m_failures); }

    void check(const ReadyFormat::Sample& sample) {
        m_line = sample.line;
        EntryColumns columns;
        const bool fits =
            m_reader->read(sample.entry, columns) && FormatFit::fits(m_description, columns);
        if (fits == sample.isRejected) {
            fail(fits ? "the entry fits, but must not"
                      : "the entry does not fit: " + std::string(m_reader->reason()));
        }
        if (!fits || sample.isRejected) {
            return;
        }
        compare("time", timeOf(columns), sample.time);
        for (const auto& [name, text] : sample.columns) {
            compare(name, *textOf(columns, *entryColumnOf(name)), text);
        }
        compareFields(sample);
        checkLines(sample.entry);
    }

private:
    void fail(std::string text) { m_failures.push_back({m_line, std::move(text)}); }

    void compare(std::string_view what, std::string_view is, std::string_view wanted) {
        if (is != wanted) {
            fail(std::string(what) + " is " + quoted(is) + ", not " + quoted(wanted));
        }
    }

    void compareFields(const ReadyFormat::Sample& sample) {
        EntryFields fields;
        m_reader->readFields(sample.entry, fields);
        for (const auto& [name, text] : sample.fields) {
            if (const std::string_view* const value = fields.find(name)) {
                compare("field " + name, *value, text);
            } else {
                fail("field " + name + " is missing");
            }
        }
    }

    /// The lines are one entry, and the first of them begins another.
    void checkLines(std::string_view entry) {
        std::string_view before = entry.substr(0, entry.find('\n'));
        const std::string_view first = before;
        while (before.size() < entry.size()) {
            entry.remove_prefix(before.size() + 1);
            const std::string_view line = entry.substr(0, entry.find('\n'));
            if (m_join == nullptr || !m_join->joins(before, line)) {
                fail("the line " + quoted(line) + " begins another entry");
                return;
            }
            before = line;
        }
        if (m_join != nullptr && m_join->joins(before, first)) {
            fail("the line " + quoted(first) + " does not begin an entry");
        }
    }

    const FormatDescription& m_description;
    const std::unique_ptr<EntryFormat::Reader> m_reader;
    const LineJoin* const m_join;
    unsigned m_line = 0;
    std::vector<SampleFailure> m_failures;
};

std::vector<SampleFailure> unusable(const Problem& problem) {
    return {{0, (problem.field.empty() ? "" : problem.field + ": ") + problem.text()}};
}

} // namespace

std::vector<SampleFailure> FormatSamples::check(const ReadyFormat& ready) {
    const auto format = makeFormat(ready.format);
    if (!format) {
        return unusable(format.error());
    }
    const auto join = makeLineJoin(ready.format);
    if (!join) {
        return unusable(join.error());
    }
    if (ready.samples.empty()) {
        return {{0, "there is no [[sample]]"}};
    }
    SampleCheck samples(ready.format, **format, join->get());
    for (const ReadyFormat::Sample& sample : ready.samples) {
        samples.check(sample);
    }
    return samples.take();
}

} // namespace zrm::host
