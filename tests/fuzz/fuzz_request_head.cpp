#include "host/http/RequestHead.h"

#include <cstdint>
#include <cstdlib>
#include <string_view>

// Whatever comes is a request or has a problem; what has none says clearly where its body ends.

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view text(reinterpret_cast<const char*>(data), size);
    const IncomingRequest incoming = RequestHead::read(text);
    if (incoming.problem) {
        return 0;
    }
    if (incoming.request.method.empty() || (incoming.isChunked && incoming.length) ||
        incoming.hasBody != (incoming.isChunked || incoming.length.value_or(0) > 0) ||
        incoming.request.path.find_first_of(" \r\n?#") != std::string::npos) {
        std::abort();
    }
    return 0;
}
