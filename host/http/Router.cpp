#include "host/http/Router.h"

#include <algorithm>
#include <iterator>
#include <optional>

namespace zrm::host {

namespace {

/// The rank of a pattern segment among the alternatives for a path segment.
constexpr char literalRank = 'a';
constexpr char captureRank = 'b';
constexpr char restRank = 'c';

char rankOf(std::string_view part) {
    if (part == "*") {
        return restRank;
    }
    return part.starts_with('{') ? captureRank : literalRank;
}

/// The texts between the slashes; the path begins with a slash.
std::vector<std::string> split(std::string_view path) {
    std::vector<std::string> parts;
    while (path.starts_with('/')) {
        path.remove_prefix(1);
        const std::size_t size = std::min(path.find('/'), path.size());
        parts.emplace_back(path.substr(0, size));
        path.remove_prefix(size);
    }
    return parts;
}

std::string joined(const std::vector<std::string>& parts, std::size_t from) {
    std::string text;
    for (std::size_t at = from; at < parts.size(); ++at) {
        text += (at == from ? "" : "/") + parts[at];
    }
    return text;
}

/// The values of the pattern's captures in the path; none when it does not match.
std::optional<std::vector<std::string>> captures(const std::vector<std::string>& pattern,
                                                 const std::vector<std::string>& path) {
    std::vector<std::string> found;
    for (std::size_t at = 0; at < pattern.size(); ++at) {
        const char rank = rankOf(pattern[at]);
        if (at >= path.size() || (rank == captureRank && path[at].empty()) ||
            (rank == literalRank && path[at] != pattern[at])) {
            return std::nullopt;
        }
        if (rank == restRank) {
            found.push_back(joined(path, at));
            return found;
        }
        if (rank == captureRank) {
            found.push_back(path[at]);
        }
    }
    return pattern.size() == path.size() ? std::optional(found) : std::nullopt;
}

void allow(std::string& methods, const std::string& method) {
    const std::string named = method == "GET" ? "GET, HEAD" : method;
    if ((", " + methods + ",").find(", " + named + ",") == std::string::npos) {
        methods += (methods.empty() ? "" : ", ") + named;
    }
}

} // namespace

void Router::add(std::string method, const std::string& pattern, Handler handler, Access access,
                 Lane lane) {
    Route route{std::move(method), pattern, split(pattern), "", std::move(handler), access, lane};
    std::transform(route.parts.begin(), route.parts.end(), std::back_inserter(route.rank), rankOf);
    m_routes.push_back(std::move(route));
}

Router::Match Router::match(std::string_view method, std::string_view path) const {
    const std::string_view wanted = method == "HEAD" ? "GET" : method;
    const std::vector<std::string> parts = split(path);
    const Route* best = nullptr;
    Match match;
    for (const Route& route : m_routes) {
        auto found = captures(route.parts, parts);
        if (!found) {
            continue;
        }
        allow(match.allow, route.method);
        if (match.pattern.empty()) {
            match.pattern = route.pattern;
        }
        if (route.method == wanted && (best == nullptr || route.rank < best->rank)) {
            best = &route;
            match.captures = std::move(*found);
        }
    }
    if (best != nullptr) {
        match.handler = &best->handler;
        match.pattern = best->pattern;
        match.access = best->access;
        match.lane = best->lane;
    }
    return match;
}

std::vector<std::pair<std::string, std::string>> Router::routes() const {
    std::vector<std::pair<std::string, std::string>> all;
    for (const Route& route : m_routes) {
        all.emplace_back(route.method, route.pattern);
    }
    return all;
}

} // namespace zrm::host
