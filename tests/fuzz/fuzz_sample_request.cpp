#include "host/api/SampleResource.h"

#include <cstdint>
#include <cstdlib>
#include <string_view>
#include <variant>
#include <vector>

#include <nlohmann/json.hpp>

using namespace zrm::host;

// Any body gives conditions or a problem document that is valid JSON and names the field.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view body(reinterpret_cast<const char*>(data), size);
    for (const char* const table : {"RMLOGENT", "RMMONLOG"}) {
        const auto result = SampleRequest::parse(table, body);
        const auto* const problem = std::get_if<Problem>(&result);
        if (problem == nullptr) {
            continue;
        }
        const auto document = nlohmann::json::parse(problem->json(), nullptr, false);
        if (document.is_discarded() || document["status"] != 400 ||
            document["field"].get<std::string>().empty()) {
            std::abort();
        }
    }
    return 0;
}
