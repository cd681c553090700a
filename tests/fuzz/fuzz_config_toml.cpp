#include "host/config/ConfigFile.h"

#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

using namespace zrm::host;

// Any text gives a configuration whose situations can be opened, or problems that each name the
// file and a cure.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view text(reinterpret_cast<const char*>(data), size);
    const ConfigFile::Result result = ConfigFile::parse(text, "zrm.toml");
    if (!result) {
        if (result.error().empty()) {
            std::abort();
        }
        for (const std::string& problem : result.error()) {
            if (!problem.starts_with("zrm.toml:") || problem.find("; ") == std::string::npos) {
                std::abort();
            }
        }
        return 0;
    }
    for (const SituationConfig& situation : result->situations) {
        if (situation.name.empty() || situation.severity.empty()) {
            std::abort();
        }
        for (const Condition& condition : situation.conditions) {
            if (condition.column.empty() || (condition.op == INTF_IN) == condition.values.empty()) {
                std::abort();
            }
        }
    }
    return 0;
}
