// The result of FormatTrial as JSON.

#include "host/base/Utf8.h"
#include "host/diagnose/FormatTrial.h"

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = nlohmann::ordered_json;

/// A line in a form that JSON can represent.
class ShownLine {
public:
    explicit ShownLine(std::string_view line) {
        while (!line.empty()) {
            const Utf8::Sequence sequence = Utf8::firstSequence(line);
            for (std::size_t i = 0; i < sequence.length; ++i) {
                m_places.push_back(text.size() + (sequence.valid ? i : 0));
            }
            text += sequence.valid ? line.substr(0, sequence.length) : Utf8::replacement;
            line.remove_prefix(sequence.length);
        }
        m_places.push_back(text.size());
    }

    /// The position in the text of a byte of the line.
    std::size_t place(std::size_t byte) const {
        return byte < m_places.size() ? m_places[byte] : text.size();
    }

    std::string text;

private:
    std::vector<std::size_t> m_places;
};

Json orNull(const std::string& text) {
    return text.empty() ? Json() : Json(text);
}

template <typename Number> Json orNull(const std::optional<Number>& number) {
    return number ? Json(*number) : Json();
}

Json lineJson(const FormatTrial::Line& line) {
    const ShownLine shown(line.line);
    Json fields = Json::array();
    for (const FormatTrial::Field& field : line.fields) {
        fields.push_back({{"from", shown.place(field.from)},
                          {"to", shown.place(field.to)},
                          {"name", field.name},
                          {"column", field.column},
                          {"value", field.value},
                          {"directive", orNull(field.directive)}});
    }
    Json row;
    for (const auto& [column, text] : line.row) {
        row[column] = text;
    }
    return {{"line", shown.text},
            {"matched", line.matched},
            {"fields", std::move(fields)},
            {"row", std::move(row)},
            {"failed_at", line.failedAt ? Json(shown.place(*line.failedAt)) : Json()},
            {"directive", orNull(line.directive)},
            {"reason", orNull(line.reason)}};
}

} // namespace

std::string FormatTrial::json(const Result& result) {
    Json directives = Json::array();
    for (const Directive& directive : result.directives) {
        directives.push_back({{"text", directive.text},
                              {"from", directive.from},
                              {"to", directive.to},
                              {"field", orNull(directive.field)},
                              {"column", orNull(directive.column)}});
    }
    Json lines = Json::array();
    for (const Line& line : result.lines) {
        lines.push_back(lineJson(line));
    }
    const Json object{{"accepted", result.accepted},
                      {"reason", orNull(result.reason)},
                      {"position", orNull(result.position)},
                      {"directives", std::move(directives)},
                      {"lines", std::move(lines)},
                      {"coverage",
                       {{"lines", result.lines.size()},
                        {"matched", result.matched},
                        {"percent", percent(result)}}},
                      {"configuration_line", orNull(result.configurationLine)},
                      {"table", orNull(result.table)}};
    return object.dump(-1, ' ', false, Json::error_handler_t::replace);
}

} // namespace zrm::host
