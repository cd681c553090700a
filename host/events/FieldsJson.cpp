#include "host/events/FieldsJson.h"

#include "base/EntryFields.h"
#include "host/base/JsonWriter.h"
#include "host/base/Utf8.h"
#include "host/events/RowText.h"

#include <algorithm>
#include <string_view>

namespace zrm::host {

namespace {

bool isWanted(const std::vector<std::string>& names, std::string_view field) {
    return std::find(names.begin(), names.end(), field) != names.end();
}

} // namespace

FieldsJson FieldsJson::of(const EntryFields& fields, const std::vector<std::string>& names,
                          std::size_t mostBytes) {
    FieldsJson result;
    const bool areAll = isWanted(names, all);
    result.isCut = areAll && fields.leftOut() > 0;
    bool isEmpty = true;
    std::size_t room = mostBytes;
    std::string converted;
    result.text = JsonWriter::text([&](JsonWriter& json) {
        json.beginObject();
        for (const auto& [name, value] : fields.all()) {
            if (!areAll && !isWanted(names, name)) {
                continue;
            }
            if (name.size() > room || (name.size() == room && !value.empty())) {
                result.isCut = true;
                break;
            }
            room -= name.size();
            const std::string_view kept = Utf8::prefix(value, room);
            json.key(RowText::ofLocal(name, converted));
            json.value(RowText::ofLocal(kept, converted));
            isEmpty = false;
            room -= kept.size();
            if (kept.size() < value.size()) {
                result.isCut = true;
                break;
            }
        }
        json.endObject();
    });
    if (isEmpty) {
        result.text.clear();
    }
    return result;
}

} // namespace zrm::host
