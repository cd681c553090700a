#include "host/api/SituationBody.h"
#include "host/config/ConfigFile.h"
#include "host/http/JsonFields.h"
#include "host/http/RequestRefused.h"
#include "host/situations/SituationJson.h"

#include <cstdint>
#include <cstdlib>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include <nlohmann/json.hpp>

using namespace zrm::host;

// Any text of a situation in a configuration file gives situations whose definitions the API takes,
// too, as the same situations, or problems that each name the file and a cure.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view text(reinterpret_cast<const char*>(data), size);
    const ConfigFile::Result result =
        ConfigFile::parse("[[situation]]\n" + std::string(text), "zrm.toml");
    if (!result) {
        for (const std::string& problem : result.error()) {
            if (!problem.starts_with("zrm.toml:") || problem.find("; ") == std::string::npos) {
                std::abort();
            }
        }
        if (result.error().empty()) {
            std::abort();
        }
        return 0;
    }
    std::set<std::string> names;
    for (const SituationConfig& situation : result->situations) {
        if (!names.insert(situation.name).second) {
            std::abort();
        }
        try {
            const std::string body = SituationJson::text(SituationJson::definition(situation));
            JsonFields fields(body);
            if (SituationBody::situation(fields) != situation) {
                std::abort();
            }
        } catch (const RequestRefused&) {
            std::abort();
        }
    }
    return 0;
}
