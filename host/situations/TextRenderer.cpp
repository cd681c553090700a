#include "host/situations/TextRenderer.h"

#include "host/base/TimeText.h"
#include "host/base/Utf8.h"
#include "host/config/Columns.h"
#include "host/events/RowText.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::string_view ellipsis = "\xe2\x80\xa6";

/// Appends a text of a log or of an operator on one line: a blank for each control.
void appendLine(std::string& out, std::string_view text) {
    const std::string_view kept = Utf8::prefix(text, TextRenderer::longestValue);
    const std::size_t begin = out.size();
    out += kept;
    std::replace_if(
        out.begin() + static_cast<std::ptrdiff_t>(begin), out.end(),
        [](char c) { return static_cast<unsigned char>(c) < ' ' || c == 0x7f; }, ' ');
    if (kept.size() < text.size()) {
        out += ellipsis;
    }
}

/// Whether a value of this name holds time stamps.
bool isTimeColumn(std::string_view name, const std::vector<Condition>& conditions) {
    const auto found = EntryNames(conditions).find(name);
    return found && found->kind == EntryName::Kind::column &&
           columnsOf("RMLOGENT")[found->column].isTime;
}

auto isNamed(std::string_view name) {
    return [name](const GroupValue& value) { return value.name == name; };
}

} // namespace

TextRenderer::TextRenderer(const SituationConfig& situation) : m_situation(situation.name) {
    const auto parsed = TextTemplate::parse(situation.text, situation.conditions);
    if (!parsed) {
        return;
    }
    EntryValues values(situation.conditions);
    for (const auto& [kind, text] : parsed->pieces()) {
        Part part{kind, text, std::nullopt};
        if (kind == Kind::value) {
            part.value = values.compile(text).value();
            part.isTime = isTimeColumn(text, situation.conditions);
        }
        m_parts.push_back(std::move(part));
    }
}

std::string TextRenderer::text(EntryReading& entry, const TextFacts& facts) const {
    return render(&entry, facts);
}

std::string TextRenderer::text(const TextFacts& facts) const {
    return render(nullptr, facts);
}

std::string TextRenderer::render(EntryReading* entry, const TextFacts& facts) const {
    std::string out;
    for (const Part& part : m_parts) {
        switch (part.kind) {
        case Kind::literal:
            out += part.text;
            break;
        case Kind::value:
            if (entry != nullptr) {
                appendValue(out, part, *entry);
            } else {
                appendKept(out, part, facts);
            }
            break;
        case Kind::count:
            out += std::to_string(facts.count);
            break;
        case Kind::first:
            UtcTime::append(out, facts.first);
            break;
        case Kind::last:
            UtcTime::append(out, facts.last);
            break;
        case Kind::log:
            appendLine(out, facts.log);
            break;
        case Kind::situation:
            appendLine(out, m_situation);
            break;
        }
        if (out.size() > longestText) {
            out.resize(Utf8::prefix(out, longestText).size());
            return out.append(ellipsis);
        }
    }
    return out;
}

void TextRenderer::appendValue(std::string& out, const Part& part, EntryReading& entry) const {
    std::string number;
    const std::string_view raw = part.value->read(entry, number);
    if (part.isTime) {
        if (const auto time = TimeText::toMilliseconds(raw)) {
            UtcTime::append(out, *time);
        }
        return;
    }
    std::string room;
    appendLine(out, RowText::ofLocal(raw, room));
}

void TextRenderer::appendKept(std::string& out, const Part& part, const TextFacts& facts) {
    for (const std::span<const GroupValue> values : {facts.group, facts.values}) {
        const auto found = std::find_if(values.begin(), values.end(), isNamed(part.text));
        if (found != values.end()) {
            appendLine(out, found->value);
            return;
        }
    }
    out += '-';
}

std::vector<GroupValue> TextRenderer::values(EntryReading& entry) const {
    std::vector<GroupValue> values;
    for (const Part& part : m_parts) {
        if (part.kind == Kind::value &&
            std::none_of(values.begin(), values.end(), isNamed(part.text))) {
            appendValue(values.emplace_back(GroupValue{part.text, ""}).value, part, entry);
        }
    }
    return values;
}

} // namespace zrm::host
