#include "host/diagnose/FormatFit.h"
#include "host/diagnose/FormatProposal.h"
#include "require.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

using namespace zrm::host;

// Lines of a sample: what is proposed for them is a format, and it can be applied to them.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::vector<std::string> lines(1);
    for (std::size_t at = 0; at < size; ++at) {
        if (data[at] == '\n') {
            lines.emplace_back();
        } else {
            lines.back() += static_cast<char>(data[at]);
        }
    }
    if (const auto format = proposeFormat(lines)) {
        const auto fit = FormatFit::of(*format, lines);
        require(fit.has_value());
        require(fit->fitting <= fit->lines && fit->entries <= fit->lines);
    }
    return 0;
}
