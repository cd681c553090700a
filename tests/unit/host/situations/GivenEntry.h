#ifndef ZRM_TESTS_GIVEN_ENTRY_H
#define ZRM_TESTS_GIVEN_ENTRY_H

#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "host/config/ConditionParser.h"
#include "host/framework/Request.h"
#include "host/framework/RowLayout.h"
#include "logs/zrm_rmlogent_data.h"
#include "tables/zrm_rmlogent_manager.h"
#include "unit/host/framework/TestTable.h"

#include <cstring>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

/// An entry of a log: its row, and its fields.
class GivenEntry : public zrm::LogEntry {
public:
    GivenEntry() {
        std::memset(&row, ' ', sizeof row);
        RequestDetail detail;
        detail.name = "layout";
        detail.sampleType = SAMPLE_REPORT;
        const Request request(m_entries, detail, m_receiver);
        layout.emplace(*request.get());
    }

    std::string_view text() const override { return {}; }
    bool isCut() const override { return false; }
    const zrm::EntryFields& fields() override { return given; }
    const zrm::EntryKeep& keep() const override { return m_keep; }

    void describe(std::string_view text) { fill(row.entrydesc, text); }
    template <std::size_t width> static void fill(char (&column)[width], std::string_view text) {
        std::memset(column, ' ', width);
        std::memcpy(column, text.data(), text.size());
    }
    const char* bytes() const { return reinterpret_cast<const char*>(&row); }

    static std::vector<Condition> conditions(const std::vector<std::string>& texts) {
        std::vector<Condition> conditions;
        PatternBudget budget;
        for (const std::string& text : texts) {
            conditions.push_back(ConditionParser("RMLOGENT").parse(text, budget).value());
        }
        return conditions;
    }

    std::optional<RowLayout> layout; ///< of Log Entries
    zrm::zrm_rmlogent_data_t row;
    zrm::EntryFields given;

private:
    zrm::zrm_rmlogent_manager m_entries{"ZRM", "RMLOGENT"};
    TestReceiver m_receiver;
    zrm::EntryKeep m_keep;
};

#endif
