#include "host/analysis/SeenFields.h"

#include "base/EntryFields.h"
#include "base/TraceScope.h"
#include "framework/LogEntry.h"
#include "host/base/JsonWriter.h"
#include "host/base/Utf8.h"
#include "host/events/RowText.h"

#include <algorithm>
#include <string_view>
#include <vector>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SeenFields.cpp"};

} // namespace

Result<void> SeenFields::read(LogFile& log) {
    TraceScope trace(anchor);
    LogTail tail(log);
    const Result<void> whole = tail.read([this](auto /*line*/, auto* /*row*/) {
        ++m_entries;
        if (LogEntry* const entry = LogEntry::ofThisThread) {
            add(entry->fields());
        }
    });
    m_reach = tail.reach();
    return whole;
}

void SeenFields::add(const EntryFields& fields) {
    for (const auto& [name, value] : fields.all()) {
        auto found = m_fields.find(name);
        if (found == m_fields.end()) {
            if (m_fields.size() == mostNames) {
                continue;
            }
            found = m_fields.emplace(name, Field()).first;
        }
        ++found->second.entries;
        found->second.example = Utf8::prefix(value, longestExample);
    }
}

void SeenFields::write(JsonWriter& json) const {
    std::vector<const std::pair<const std::string, Field>*> fields;
    for (const auto& field : m_fields) {
        fields.push_back(&field);
    }
    std::stable_sort(fields.begin(), fields.end(), [](const auto* left, const auto* right) {
        return left->second.entries > right->second.entries;
    });
    std::string room;
    json.key("fields").beginArray();
    for (const auto* const field : fields) {
        json.beginObject().member("name", RowText::ofLocal(field->first, room));
        json.member("entries", field->second.entries);
        json.member("example", RowText::ofLocal(field->second.example, room)).endObject();
    }
    json.endArray().member("entries", m_entries);
    m_reach.write(json);
}

} // namespace zrm::host
