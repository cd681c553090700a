#include "host/events/EntryEvents.h"

#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "host/base/JsonWriter.h"
#include "host/base/Utf8.h"
#include "host/events/RowText.h"

#include <algorithm>
#include <span>

namespace zrm::host {

namespace {

using Names = std::vector<std::string>;

void writeField(JsonWriter& json, const EntryFields::Field& field) {
    std::string room;
    json.key(RowText::ofLocal(field.name, room));
    json.value(RowText::ofLocal(field.value, room));
}

bool isWanted(const Names& names, std::string_view field) {
    return std::find(names.begin(), names.end(), field) != names.end();
}

/// The fields of these names as a JSON object; empty if the entry has none of them.
std::string fieldsText(LogEntry& entry, const Names& names) {
    if (names.empty()) {
        return {};
    }
    const bool areAll = isWanted(names, "*");
    bool isEmpty = true;
    std::string text = JsonWriter::text([&](JsonWriter& json) {
        json.beginObject();
        for (const EntryFields::Field& field : entry.fields().all()) {
            if (areAll || isWanted(names, field.name)) {
                writeField(json, field);
                isEmpty = false;
            }
        }
        json.endObject();
    });
    return isEmpty ? std::string() : text;
}

EntryDetail detailOf(LogEntry& entry, const Names& names) {
    EntryDetail detail;
    detail.fields = fieldsText(entry, names);
    const std::string_view text = entry.text();
    if (text.empty() || entry.keep().textBytes == 0) {
        return detail;
    }
    const std::string_view kept = Utf8::prefix(text, entry.keep().textBytes);
    std::string room;
    detail.isCut = kept.size() < text.size() || entry.isCut();
    detail.text =
        JsonWriter::text([&](JsonWriter& json) { json.value(RowText::ofLocal(kept, room)); });
    return detail;
}

} // namespace

void EntryEvents::describe(LogEntry& entry) {
    const auto& kept = entry.keep().fields;
    const Names* last = nullptr;
    m_details.clear();
    for (const auto& situation : m_situations) {
        const Names& names = kept ? *kept : situation->fields;
        // Situations mostly keep the same.
        m_details.push_back(last != nullptr && *last == names
                                ? m_details.back()
                                : std::make_shared<const EntryDetail>(detailOf(entry, names)));
        last = &names;
    }
}

} // namespace zrm::host
