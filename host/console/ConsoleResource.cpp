#include "host/console/ConsoleResource.h"

#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

#include <string>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::pair<std::string_view, const char*> contentTypes[] = {
    {".html", "text/html; charset=utf-8"},
    {".js", "text/javascript; charset=utf-8"},
    {".css", "text/css; charset=utf-8"},
    {".svg", "image/svg+xml"},
};

// The page runs only its own files, and no other site may frame it.
constexpr const char* contentSecurityPolicy =
    "default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self'; connect-src 'self'; "
    "base-uri 'none'; form-action 'none'; frame-ancestors 'none'";

const char* contentTypeOf(std::string_view name) {
    for (const auto& [ending, type] : contentTypes) {
        if (name.ends_with(ending)) {
            return type;
        }
    }
    return "application/octet-stream";
}

HttpAnswer answerWith(std::string_view name) {
    const ConsoleFile* file = ConsoleFile::find(name);
    if (file == nullptr) {
        throw RequestRefused(404, "the console has no such file", "");
    }
    HttpAnswer answer;
    answer.contentType = contentTypeOf(file->name);
    answer.body = file->content;
    answer.headers = {
        {"Content-Security-Policy", contentSecurityPolicy},
        {"Referrer-Policy", "no-referrer"},
        {"Cross-Origin-Opener-Policy", "same-origin"},
        {"Cache-Control", "no-cache"}, // other versions of the agent have different files
    };
    return answer;
}

} // namespace

void ConsoleResource::addRoutes(Router& router) {
    router.add(
        "GET", "/", [](const HttpRequest&) { return answerWith("index.html"); }, Router::PUBLIC);
    router.add(
        "GET", "/console/*",
        [](const HttpRequest& request) {
            return answerWith(std::string_view(request.path).substr(sizeof("/console/") - 1));
        },
        Router::PUBLIC);
}

} // namespace zrm::host
