#include "host/events/EntryEvents.h"

#include "framework/LogEntry.h"
#include "host/base/JsonWriter.h"
#include "host/base/Utf8.h"
#include "host/events/EntryContext.h"
#include "host/events/FieldsJson.h"
#include "host/events/RowText.h"

#include <string_view>

namespace zrm::host {

namespace {

/// The fields of these names as a JSON object; empty if the entry has none of them.
std::string fieldsText(LogEntry& entry, const std::vector<std::string>& names) {
    return names.empty() ? std::string() : FieldsJson::of(entry.fields(), names).text;
}

std::string textOf(LogEntry& entry) {
    const std::string_view kept = Utf8::prefix(entry.text(), entry.keep().textBytes);
    std::string room;
    return kept.empty() ? std::string() : JsonWriter::text([&](JsonWriter& json) {
        json.value(RowText::ofLocal(kept, room));
    });
}

std::string contextText(const EntryContext& context, std::size_t entries) {
    const std::vector<std::string_view> texts = context.before(entries);
    std::string room;
    return texts.empty() ? std::string() : JsonWriter::text([&](JsonWriter& json) {
        json.beginArray();
        for (const std::string_view text : texts) {
            json.value(RowText::ofLocal(text, room));
        }
        json.endArray();
    });
}

} // namespace

void EntryEvents::drop() noexcept {
    m_events.clear();
    m_details.clear();
    m_rows.clear();
}

void EntryEvents::add(const std::shared_ptr<const SituationLabel>& situation, const char* row,
                      std::size_t rowSize, const std::shared_ptr<const EventJudgement>& judgement) {
    m_events.push_back({situation, judgement, m_rows.size(), row != nullptr});
    if (row != nullptr) {
        m_rows.insert(m_rows.end(), row, row + rowSize);
    }
}

std::vector<EpisodeShare> EntryEvents::shares() const {
    std::vector<EpisodeShare> shares;
    shares.reserve(m_shares.size());
    for (const auto& share : m_shares) {
        shares.push_back(*share);
    }
    return shares;
}

void EntryEvents::forgetShares() noexcept {
    for (const auto& share : m_shares) {
        share->isNoted.store(false, std::memory_order_release);
    }
    m_shares.clear();
}

void EntryEvents::describe(LogEntry& entry, const EntryContext& context) {
    const EntryKeep& keep = entry.keep();
    const SituationLabel* last = nullptr;
    std::shared_ptr<const EntryDetail> lastDetail;
    m_details.clear();
    for (const auto& [situation, judgement, at, hasRow] : m_events) {
        if (!hasRow) { // not an event of this entry: the entry has only shown that it was due
            m_details.push_back(nullptr);
            continue;
        }
        // Situations mostly keep the same.
        if (last != nullptr && last->fields == situation->fields &&
            last->context == situation->context) {
            m_details.push_back(lastDetail);
            continue;
        }
        last = situation.get();
        auto detail = std::make_shared<EntryDetail>();
        detail->fields = fieldsText(entry, keep.fields ? *keep.fields : situation->fields);
        detail->text = textOf(entry);
        detail->isCut =
            !detail->text.empty() && (entry.isCut() || entry.text().size() > keep.textBytes);
        detail->context = contextText(context, situation->context);
        lastDetail = std::move(detail);
        m_details.push_back(lastDetail);
    }
}

} // namespace zrm::host
