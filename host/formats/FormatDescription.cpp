#include "host/formats/FormatDescription.h"

#include "host/base/JsonWriter.h"

namespace zrm::host {

namespace {

void write(JsonWriter& json, const std::vector<std::string>& texts) {
    json.beginArray();
    for (const std::string& text : texts) {
        json.value(text);
    }
    json.endArray();
}

void write(JsonWriter& json, const std::map<std::string, std::string>& texts) {
    json.beginObject();
    for (const auto& [name, text] : texts) {
        json.member(name, text);
    }
    json.endObject();
}

} // namespace

std::string FormatDescription::definition() const {
    return JsonWriter::text([this](JsonWriter& json) {
        json.beginObject().member("type", type).key("patterns");
        write(json, patterns);
        json.member("time_format", timeFormat).key("columns");
        write(json, columns);
        write(json.key("defaults"), defaults);
        json.key("values").beginObject();
        for (const auto& [column, exchanged] : values) {
            write(json.key(column), exchanged);
        }
        json.endObject().member("unwrap", unwrap).key("extracts").beginArray();
        for (const Extract& extract : extracts) {
            json.beginObject().member("source", extract.source).key("patterns");
            write(json, extract.patterns);
            json.endObject();
        }
        json.endArray().member("pairs", pairs).endObject();
    });
}

} // namespace zrm::host
