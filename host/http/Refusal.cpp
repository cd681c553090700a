#include "host/http/Refusal.h"

#include "host/base/SteeringText.h"

#include <algorithm>
#include <array>
#include <utility>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

constexpr std::array<std::pair<int, const char*>, 17> titles = {{
    {400, "Bad Request"},
    {401, "Unauthorized"},
    {403, "Forbidden"},
    {404, "Not Found"},
    {405, "Method Not Allowed"},
    {408, "Request Timeout"},
    {409, "Conflict"},
    {412, "Precondition Failed"},
    {413, "Content Too Large"},
    {414, "URI Too Long"},
    {415, "Unsupported Media Type"},
    {421, "Misdirected Request"},
    {422, "Unprocessable Content"},
    {429, "Too Many Requests"},
    {431, "Request Header Fields Too Large"},
    {500, "Internal Server Error"},
    {503, "Service Unavailable"},
}};

} // namespace

std::string Refusal::json() const {
    const auto title = std::find_if(titles.begin(), titles.end(),
                                    [&](const auto& known) { return known.first == status; });
    nlohmann::ordered_json document = {
        {"type", "about:blank"},
        {"title", title == titles.end() ? "Error" : title->second},
        {"status", status},
        {"detail", problem.text()},
    };
    if (!problem.field.empty()) {
        document["field"] = problem.field;
    }
    // A detail may quote what the client sent: bytes that are not UTF-8 are replaced, and what
    // steers a terminal is escaped.
    return SteeringText::escapedInJson(
        document.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace));
}

} // namespace zrm::host
