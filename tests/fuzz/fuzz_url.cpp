#include "host/base/UrlText.h"
#include "host/base/Utf8.h"
#include "host/http/Router.h"

#include <cstdint>
#include <cstdlib>
#include <string_view>

using namespace zrm::host;

// Any path finds a route or none, and whatever is decoded of a URL is text.

namespace {

bool isText(std::string_view text) {
    return text.find('\0') == std::string_view::npos && Utf8::validPrefix(text) == text.size();
}

Router& router() {
    static Router* const theRouter = [] {
        auto* const router = new Router;
        for (const char* const pattern : {"/", "/a/{b}", "/a/{b}/c", "/a/b", "/d/*"}) {
            router->add("GET", pattern, [](const HttpRequest&) { return HttpAnswer(); });
        }
        return router;
    }();
    return *theRouter;
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string_view text(reinterpret_cast<const char*>(data), size);
    const Router::Match match = router().match("GET", text);
    if ((match.handler == nullptr) != match.allow.empty()) {
        std::abort();
    }
    for (const std::string& capture : match.captures) {
        if (const auto decoded = UrlText::decode(capture); decoded && !isText(*decoded)) {
            std::abort();
        }
    }
    if (const auto query = UrlText::query(text)) {
        for (const auto& [name, value] : *query) {
            if (!isText(name) || !isText(value)) {
                std::abort();
            }
        }
    }
    return 0;
}
