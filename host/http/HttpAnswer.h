#ifndef ZRM_HOST_HTTP_ANSWER_H
#define ZRM_HOST_HTTP_ANSWER_H

#include <functional>
#include <stop_token>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

/// Sends a part of a body to the client. False when the client is gone, or reads too slowly: the
/// stream ends then. An empty part sends nothing and tells whether the client is there.
using BodyWriter = std::function<bool(std::string_view)>;

/// The answer to a request.
struct HttpAnswer {
    using Stream = std::function<void(const BodyWriter&, const std::stop_token&)>;

    int status = 200;
    std::string contentType = "application/json";
    std::string body;
    std::vector<std::pair<std::string, std::string>> headers = {}; ///< further ones
    /// In place of `body`, writes one that goes on until the function returns. It returns soon
    /// after the token asks for it, and runs on the connection's own thread.
    Stream stream = {};

    /// An answer of status 200 with a JSON text.
    static HttpAnswer json(std::string text) { return {200, "application/json", std::move(text)}; }
};

#endif
