#include "host/http/RequestParser.h"

#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

using namespace zrm::host;

// Whatever comes is a request or has a problem; what has none says clearly where its body ends. It
// does not matter in which pieces the bytes come.

namespace {

/// Feeds the bytes in pieces of this size until the head is done. Behind the bytes, which are a
/// head without its end, comes the end.
IncomingRequest read(std::string_view text, std::size_t piece, bool& isDone) {
    RequestParser parser;
    const std::string bytes = std::string(text) + "\r\n\r\n";
    std::string waiting;
    for (std::size_t at = 0; at < bytes.size() && !parser.isHeadDone(); at += piece) {
        waiting += bytes.substr(at, piece);
        waiting.erase(0, parser.put(waiting));
    }
    isDone = parser.isHeadDone();
    return isDone ? parser.takeHead() : IncomingRequest{};
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view text(reinterpret_cast<const char*>(data), size);
    bool isDone = false;
    bool isDoneSlowly = false;
    const IncomingRequest incoming = read(text, size + 4, isDone);
    const IncomingRequest slow = read(text, 3, isDoneSlowly);
    if (isDone != isDoneSlowly || incoming.refusal.has_value() != slow.refusal.has_value()) {
        std::abort();
    }
    if (!isDone || incoming.refusal) {
        return 0;
    }
    if (incoming.request.method.empty() || (incoming.isChunked && incoming.length) ||
        incoming.hasBody != (incoming.isChunked || incoming.length.value_or(0) > 0) ||
        incoming.request.path.find_first_of(" \r\n?#") != std::string::npos) {
        std::abort();
    }
    return 0;
}
