#include "host/http/RequestParser.h"

#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

using namespace zrm::host;

// A body in chunks is read, refused, or not over yet. In whichever pieces its bytes come, the same
// ones are read, with the same text; only how soon others are refused may differ. No more is taken
// than came, and never more than is allowed.

namespace {

constexpr std::size_t mostBody = 64;

struct Outcome {
    bool isDone = false;
    bool isRefused = false;
    std::string body;
    bool isSame(const Outcome& other) const { return isDone == other.isDone && body == other.body; }
};

Outcome read(std::string_view bytes, std::size_t piece) {
    RequestParser parser;
    parser.put("POST / HTTP/1.1\r\nHost: h\r\nTransfer-Encoding: chunked\r\n\r\n");
    parser.limitBody(mostBody);
    std::string waiting;
    for (std::size_t at = 0; at < bytes.size(); at += piece) {
        waiting += bytes.substr(at, piece);
        for (std::size_t count = 1; count > 0 && !waiting.empty();) {
            count = parser.put(waiting);
            if (count > waiting.size()) {
                std::abort();
            }
            waiting.erase(0, count);
        }
    }
    Outcome outcome;
    outcome.isDone = parser.isDone();
    outcome.isRefused = parser.bodyRefusal().has_value();
    outcome.body = outcome.isDone ? parser.takeBody() : "";
    return outcome;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    // What follows lets the parser judge the last bytes too: it waits until it has seen enough.
    const std::string bytes =
        std::string(reinterpret_cast<const char*>(data), size) + std::string(2 * mostBody, '.');
    const Outcome whole = read(bytes, bytes.size());
    if (whole.body.size() > mostBody || (whole.isDone && whole.isRefused) ||
        !whole.isSame(read(bytes, 1)) || !whole.isSame(read(bytes, 3))) {
        std::abort();
    }
    return 0;
}
