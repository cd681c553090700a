#include "host/api/ReportResource.h"
#include "host/http/RequestRefused.h"

#include <cstdint>
#include <cstdlib>
#include <string_view>

using namespace zrm::host;

// Any body gives a report with its log and its window, or a problem that names its place.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view text(reinterpret_cast<const char*>(data), size);
    try {
        const ReportRequest report = ReportRequest::parse(text);
        if (report.from.size() != 16 || report.to.size() != 16 || report.from > report.to ||
            report.conditions.size() < 4 || report.log.empty()) {
            std::abort();
        }
    } catch (const RequestRefused& refused) {
        if (refused.refusal().status != 400 || refused.problem().what.empty() ||
            refused.problem().field.empty()) {
            std::abort();
        }
    }
    return 0;
}
