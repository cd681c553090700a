#include "host/sinks/EventRow.h"

#include <algorithm>
#include <utility>

#include <nlohmann/json.hpp>

namespace zrm::host {

EventRow::EventRow(const EventRecord& event) {
    const auto json = nlohmann::ordered_json::parse(event.json, nullptr, false);
    const auto row = json.is_object() ? json.find("row") : json.end();
    if (row == json.end() || !row->is_object()) {
        return;
    }
    if (const auto entry = json.find("entry"); entry != json.end() && entry->is_string()) {
        m_entry = entry->get<std::string>();
    }
    if (const auto fields = json.find("fields"); fields != json.end() && fields->is_object()) {
        for (const auto& [name, value] : fields->items()) {
            if (value.is_string()) {
                m_fields.push_back({name, value.get<std::string>()});
            }
        }
    }
    for (const auto& [name, value] : row->items()) {
        if (value.is_string()) {
            m_columns.push_back({name, value.get<std::string>()});
        } else if (value.is_number_integer()) {
            m_columns.push_back({name, value.get<std::int64_t>()});
        }
    }
}

std::string_view EventRow::text(std::string_view column) const {
    const auto found = std::find_if(m_columns.begin(), m_columns.end(),
                                    [&](const Column& known) { return known.name == column; });
    const auto* const text =
        found == m_columns.end() ? nullptr : std::get_if<std::string>(&found->value);
    return text == nullptr ? std::string_view() : *text;
}

std::string_view EventRow::description() const {
    const std::string_view utf8 = text("UENTRYDESC");
    return utf8.empty() ? text("ENTRYDESC") : utf8;
}

std::string_view EventRow::source() const {
    const std::string_view utf8 = text("UENTRYSRC");
    return utf8.empty() ? text("ENTRYSRC") : utf8;
}

std::string_view EventRow::node() const {
    // The node type follows a colon.
    const std::string_view node = text("ORIGINNODE");
    return node.substr(0, node.rfind(':'));
}

} // namespace zrm::host
