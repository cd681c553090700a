#include "host/diagnose/RuleSamples.h"

#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "host/config/Columns.h"
#include "host/config/ReadyFormats.h"
#include "host/config/ReadyRules.h"
#include "host/diagnose/FormatFit.h"
#include "host/framework/CompiledCondition.h"
#include "host/framework/FilterList.h"
#include "host/framework/RowLayout.h"
#include "logs/zrm_rmlogent_data.h"

#include <algorithm>
#include <cstring>
#include <map>
#include <memory>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

/// The columns of Log Entries, which follow each other without gaps.
std::vector<RowColumn> columnsOfEntries() {
    std::vector<RowColumn> columns;
    std::size_t offset = 0;
    for (const Column& column : columnsOf("RMLOGENT")) {
        const auto width = static_cast<std::size_t>(column.width);
        columns.push_back({std::string(column.name), offset, width,
                           column.isNumber ? COLUMN_INTEGER
                           : column.isUtf8 ? COLUMN_UTF8
                                           : COLUMN_CHARACTER});
        offset += width;
    }
    return columns;
}

/// A sample, as a log's thread would offer it.
class SampleEntry : public LogEntry {
public:
    /// False if the entry does not fit the format.
    bool read(EntryFormat::Reader& reader, const FormatDescription& format,
              const std::string& entry) {
        m_reader = &reader;
        m_text = entry;
        EntryColumns columns;
        if (!reader.read(entry, columns) || !FormatFit::fits(format, columns)) {
            return false;
        }
        std::memset(&m_row, ' ', sizeof m_row);
        fill(m_row.entrysys, columns.system);
        fill(m_row.entrysrc, columns.source);
        fill(m_row.uentrysrc, columns.source);
        fill(m_row.entrytype, columns.type);
        fill(m_row.entryclass, columns.entryClass);
        fill(m_row.entrydesc, columns.description);
        fill(m_row.uentrydesc, columns.description);
        return true;
    }
    char* row() noexcept { return reinterpret_cast<char*>(&m_row); }

    std::string_view text() const override { return m_text; }
    bool isCut() const override { return false; }
    const EntryFields& fields() override {
        if (!m_hasFields) {
            m_reader->readFields(m_text, m_fields);
            m_hasFields = true;
        }
        return m_fields;
    }
    const EntryKeep& keep() const override { return m_keep; }

private:
    template <std::size_t width> static void fill(char (&column)[width], std::string_view text) {
        text.copy(column, width);
    }

    EntryFormat::Reader* m_reader = nullptr;
    std::string m_text;
    zrm_rmlogent_data_t m_row;
    EntryFields m_fields;
    bool m_hasFields = false;
    EntryKeep m_keep;
};

/// The conditions of a rule, without its thresholds.
class RuleConditions {
public:
    explicit RuleConditions(const ReadyRule& rule)
        : m_filters(rule.situation.conditions), m_columns(columnsOfEntries()) {
        for (const SEL1_FILTERINFO& filter : m_filters.all()) {
            if (isThresholdColumn(filter.columnName)) {
                continue;
            }
            const auto column =
                std::find_if(m_columns.begin(), m_columns.end(), [&](const RowColumn& known) {
                    return known.name == filter.columnName;
                });
            m_conditions.emplace_back(filter, column == m_columns.end() ? nullptr : &*column);
        }
    }

    bool hold(SampleEntry& entry) const {
        const LogEntry::Offer offer(entry);
        return std::all_of(m_conditions.begin(), m_conditions.end(),
                           [&](const auto& one) { return one.holds(nullptr, entry.row()); });
    }

private:
    const FilterList m_filters;
    const std::vector<RowColumn> m_columns;
    std::vector<CompiledCondition> m_conditions;
};

/// A format that samples name, ready to read.
struct SampleFormat {
    FormatDescription description;
    std::shared_ptr<const EntryFormat> format;
};

class SampleCheck {
public:
    SampleCheck(const ReadyRule& rule, const ReadyFormats& formats)
        : m_conditions(rule), m_formats(formats) {}

    void check(const ReadyRule::Sample& sample) {
        const Result<SampleFormat> format = formatOf(sample.format);
        if (!format) {
            failures.push_back({sample.line, format.error().text()});
            return;
        }
        const std::unique_ptr<EntryFormat::Reader> reader = format->format->reader();
        SampleEntry entry;
        if (!entry.read(*reader, format->description, sample.entry)) {
            failures.push_back({sample.line, "the entry does not fit the format"});
            return;
        }
        const bool isMet = m_conditions.hold(entry);
        if (isMet == sample.isMiss) {
            failures.push_back({sample.line, isMet ? "the entry meets the conditions, but must not"
                                                   : "the entry does not meet the conditions"});
        }
    }

    std::vector<SampleFailure> failures;

private:
    Result<SampleFormat> formatOf(const std::string& name) const {
        SampleFormat format;
        format.description.type = "syslog";
        if (!name.empty()) {
            Result<ReadyFormat> ready = m_formats.find(name);
            if (!ready) {
                return tl::unexpected(ready.error());
            }
            format.description = std::move(ready->format);
        }
        auto made = makeFormat(format.description);
        if (!made) {
            return tl::unexpected(made.error());
        }
        format.format = std::move(*made);
        return format;
    }

    const RuleConditions m_conditions;
    const ReadyFormats& m_formats;
};

} // namespace

std::vector<SampleFailure> RuleSamples::check(const ReadyRule& rule, const ReadyFormats& formats) {
    SampleCheck samples(rule, formats);
    for (const bool isMiss : {false, true}) {
        if (std::none_of(rule.samples.begin(), rule.samples.end(),
                         [&](const auto& sample) { return sample.isMiss == isMiss; })) {
            samples.failures.push_back(
                {0, isMiss ? "there is no [[sample]] with miss = true" : "there is no [[sample]]"});
        }
    }
    for (const ReadyRule::Sample& sample : rule.samples) {
        samples.check(sample);
    }
    return std::move(samples.failures);
}

} // namespace zrm::host
