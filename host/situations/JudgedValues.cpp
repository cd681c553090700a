#include "host/situations/JudgedValues.h"

#include "base/TraceScope.h"
#include "host/events/RowText.h"
#include "host/situations/GroupKey.h"

#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"JudgedValues.cpp"};

} // namespace

JudgedValues::JudgedValues(const SituationConfig& config) : m_then(config.judgement.thenValue()) {
    TraceScope trace(anchor);
    EntryValues values(config.conditions);
    const auto compile = [&](const std::string& name) {
        Result<EntryValue> value = values.compile(name);
        if (!value) { // the validator knows the same names
            trace.error()("Situation %s: %s.", config.name.c_str(), value.error().what.c_str());
        }
        return value ? std::optional(std::move(*value)) : std::nullopt;
    };
    for (const std::string& name : config.judgement.groupBy) {
        if (auto value = compile(name)) {
            m_groupValues.push_back(std::move(*value));
        }
    }
    if (!config.judgement.distinct.empty()) {
        m_distinctValue = compile(config.judgement.distinct);
    }
    if (!config.judgement.then.empty()) {
        m_thenValue = compile(std::string(config.judgement.thenName()));
    }
}

/// The value in the reading's entry, in UTF-8.
std::string_view JudgedValues::valueOf(const EntryValue& value) {
    return RowText::ofLocal(value.read(m_reading, m_room), m_utf8);
}

void JudgedValues::read(const RowLayout& layout, const char* row, LogEntry* entry) {
    m_reading.begin(layout, row, entry);
    m_group.clear();
    for (const EntryValue& value : m_groupValues) {
        GroupKey::append(m_group, valueOf(value));
    }
    if (m_distinctValue) {
        m_distinct = valueOf(*m_distinctValue);
    }
    if (m_thenValue) {
        m_mayRaise = valueOf(*m_thenValue) == m_then;
    }
}

} // namespace zrm::host
