#include "host/api/SampleResource.h"
#include "host/http/RequestRefused.h"

#include <cstdint>
#include <cstdlib>
#include <string_view>

#include <nlohmann/json.hpp>

using namespace zrm::host;

// Any body gives conditions or a problem document that is valid JSON and names the field.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view body(reinterpret_cast<const char*>(data), size);
    for (const char* const table : {"RMLOGENT", "RMMONLOG"}) {
        try {
            SampleRequest::parse(table, body);
        } catch (const RequestRefused& refused) {
            const auto document = nlohmann::json::parse(refused.refusal().json(), nullptr, false);
            if (document.is_discarded() || document["status"] != 400 ||
                document["field"].get<std::string>().empty()) {
                std::abort();
            }
        }
    }
    return 0;
}
