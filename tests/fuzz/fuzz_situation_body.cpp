#include "host/api/SituationBody.h"
#include "host/config/ConfigFile.h"
#include "host/http/JsonFields.h"
#include "host/http/RequestRefused.h"
#include "host/situations/SituationJson.h"

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include <nlohmann/json.hpp>

using namespace zrm::host;

// Any body gives a situation, or a problem document that is valid JSON and names the field. What a
// situation's definition is shown as gives the same situation again, and so does the same
// definition in a configuration file.

namespace {

std::optional<SituationConfig> read(std::string_view body) {
    try {
        JsonFields fields(body);
        return SituationBody::situation(fields);
    } catch (const RequestRefused& refused) {
        const auto document = nlohmann::json::parse(refused.refusal().json(), nullptr, false);
        if (document.is_discarded() || document["status"] != 400 ||
            document["field"].get<std::string>().empty() ||
            document["detail"].get<std::string>().empty()) {
            std::abort();
        }
        return std::nullopt;
    }
}

std::string tomlString(std::string_view text) {
    std::string result = "\"";
    for (const char c : text) {
        if (c == '"' || c == '\\') {
            result += {'\\', c};
        } else if (static_cast<unsigned char>(c) < 0x20 || c == 0x7f) {
            char escape[8];
            std::snprintf(escape, sizeof escape, "\\u%04x", static_cast<unsigned>(c));
            result += escape;
        } else {
            result += c;
        }
    }
    return result + '"';
}

std::string tomlOf(const SituationConfig& situation) {
    std::string text = "[[situation]]\nname = " + tomlString(situation.name) +
                       "\ntext = " + tomlString(situation.text) +
                       "\nseverity = " + tomlString(situation.severity) + "\nwhen = [";
    for (const std::string& condition : situation.when) {
        text += tomlString(condition) + ", ";
    }
    text += "]\n";
    const auto add = [&](const char* key, const std::optional<std::string>& value) {
        text += value ? std::string(key) + " = " + tomlString(*value) + '\n' : "";
    };
    add("log", situation.log);
    add("frequency", situation.frequency);
    add("period", situation.period);
    return text;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const auto situation = read({reinterpret_cast<const char*>(data), size});
    if (!situation) {
        return 0;
    }
    if (read(SituationJson::text(SituationJson::definition(*situation))) != situation) {
        std::abort();
    }
    const ConfigFile::Result file = ConfigFile::parse(tomlOf(*situation), "zrm.toml");
    if (!file || file->situations != std::vector{*situation}) {
        std::abort();
    }
    return 0;
}
