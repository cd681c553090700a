#ifndef ZRM_HOST_MESSAGE_H
#define ZRM_HOST_MESSAGE_H

#include "host/base/SteeringText.h"

#include <functional>
#include <map>
#include <memory>
#include <stop_token>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// A request as a resource sees it, after all access checks.
struct HttpRequest {
    std::string method;                ///< GET also for HEAD requests
    std::string path;                  ///< as sent, without the query
    std::vector<std::string> captures; ///< the pattern's {names} in order, decoded, valid UTF-8
    std::multimap<std::string, std::string> query; ///< decoded, valid UTF-8
    std::string body;                              ///< empty, or sent as application/json
    std::string lastEventId;                       ///< header Last-Event-ID; empty if absent
    std::string accept;                            ///< header Accept; empty if absent
    /// Requested once the answer is no longer needed, so that long work ends early. A token without
    /// a state is never requested.
    std::stop_token cancelled;
};

/// Sends a body to its client as it is produced. Any thread; nothing here waits.
class BodyChannel {
public:
    virtual ~BodyChannel() = default;

    /// Sends the next part. It is kept in memory until the client has taken it, so a writer with a
    /// lot to send continues only while isReady(). Does nothing once the channel is closed.
    virtual void send(std::string text) = 0;

    /// True when the client has taken everything that was sent.
    virtual bool isReady() const = 0;

    /// False when the client has left or reads too slowly, or the server stops.
    virtual bool isOpen() const = 0;

    /// Ends the body.
    virtual void end() = 0;
};

/// The answer to a request.
struct HttpAnswer {
    /// Begins a body that is sent as it is produced. `changed` may be called whenever the channel
    /// has become ready or was closed, on a thread that must not be kept waiting.
    struct Stream {
        std::function<void(std::shared_ptr<BodyChannel>)> begin;
        std::function<void()> changed;
        explicit operator bool() const noexcept { return begin != nullptr; }
    };

    int status = 200;
    std::string contentType = "application/json";
    std::string body;
    std::vector<std::pair<std::string, std::string>> headers = {}; ///< further ones
    Stream stream = {};                                            ///< in place of `body`

    /// An answer of status 200 with a JSON text in which control characters are escaped.
    static HttpAnswer json(std::string text) {
        return {200, "application/json", SteeringText::escapedInJson(std::move(text))};
    }
};

} // namespace zrm::host

#endif
