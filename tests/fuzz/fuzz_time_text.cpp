#include "host/base/TimeText.h"

#include <cstdint>
#include <cstdlib>
#include <optional>
#include <string>
#include <string_view>

using namespace zrm::host;

// A text that is a time gives 16 digits, which are the same time again.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view text(reinterpret_cast<const char*>(data), size);
    const std::optional<std::string> stamp = TimeText::toStamp(text);
    if (stamp &&
        (stamp->size() != 16 || stamp->find_first_not_of("0123456789") != std::string::npos ||
         TimeText::toStamp(*stamp) != stamp)) {
        std::abort();
    }
    return 0;
}
