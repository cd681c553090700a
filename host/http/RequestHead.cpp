#include "host/http/RequestHead.h"

#include "host/http/RequestRefused.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <map>
#include <string>
#include <utility>

#include <strings.h>

namespace {

constexpr std::array methods = {"GET",   "HEAD",    "POST",    "PUT",  "DELETE",
                                "PATCH", "OPTIONS", "CONNECT", "TRACE"};

/// Headers that decide something: each comes once, or it is open which one decides.
constexpr std::array singleHeaders = {"Host",
                                      "Origin",
                                      "Authorization",
                                      "Content-Type",
                                      "Content-Length",
                                      "Transfer-Encoding",
                                      "Content-Encoding",
                                      "Last-Event-ID"};

struct IgnoringCase {
    bool operator()(const std::string& left, const std::string& right) const {
        return strcasecmp(left.c_str(), right.c_str()) < 0;
    }
};
using Headers = std::multimap<std::string, std::string, IgnoringCase>;

[[noreturn]] void refuse(int status, std::string detail, std::string field = "") {
    throw RequestRefused(status, std::move(detail), std::move(field));
}

bool isControl(char c) {
    return (c >= '\0' && c < ' ') || c == '\x7f';
}

/// True for a character of a header's name.
bool isNameCharacter(char c) {
    constexpr std::string_view marks = "!#$%&'*+-.^_`|~";
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
           marks.find(c) != std::string_view::npos;
}

std::string_view takeUntil(std::string_view& text, std::string_view separator) {
    const std::size_t end = std::min(text.find(separator), text.size());
    const std::string_view part = text.substr(0, end);
    text.remove_prefix(std::min(end + separator.size(), text.size()));
    return part;
}

std::string_view trimmed(std::string_view text) {
    constexpr std::string_view blanks = " \t";
    const std::size_t begin = std::min(text.find_first_not_of(blanks), text.size());
    text.remove_prefix(begin);
    return text.substr(0, text.find_last_not_of(blanks) + 1);
}

/// Takes "http://HOST:PORT" off a target that has it; what it names is then the request's host.
void takeAuthority(std::string_view& target, std::optional<std::string>& host) {
    for (const std::string_view scheme : {"http://", "https://"}) {
        if (target.size() > scheme.size() &&
            strncasecmp(target.data(), scheme.data(), scheme.size()) == 0) {
            target.remove_prefix(scheme.size());
            const std::size_t end = std::min(target.find_first_of("/?"), target.size());
            host = target.substr(0, end);
            target.remove_prefix(end);
            return;
        }
    }
}

void readTarget(std::string_view target, IncomingRequest& incoming) {
    takeAuthority(target, incoming.headers.host);
    target = target.substr(0, target.find('#'));
    incoming.request.path = takeUntil(target, "?");
    incoming.rawQuery = target;
}

/// The first line. Its version, which says whether the connection lives on.
std::string_view readRequestLine(std::string_view line, IncomingRequest& incoming,
                                 std::string_view& target) {
    const std::string_view method = takeUntil(line, " ");
    target = takeUntil(line, " ");
    const bool isPlain = !target.empty() && std::none_of(target.begin(), target.end(), isControl);
    if (std::find(methods.begin(), methods.end(), method) == methods.end() || !isPlain ||
        (line != "HTTP/1.1" && line != "HTTP/1.0")) {
        refuse(400, "the request cannot be read as HTTP");
    }
    incoming.request.method = method;
    if (target.size() > RequestHead::largestTarget) {
        refuse(414, "path and query have more than " + std::to_string(RequestHead::largestTarget) +
                        " bytes");
    }
    return line;
}

Headers readHeaders(std::string_view lines) {
    Headers headers;
    while (!lines.empty()) {
        std::string_view line = takeUntil(lines, "\r\n");
        if (line.size() > RequestHead::largestLine) {
            refuse(431,
                   "a header has more than " + std::to_string(RequestHead::largestLine) + " bytes");
        }
        const std::size_t colon = std::min(line.find(':'), line.size());
        const std::string_view name = line.substr(0, colon);
        const bool isName = !name.empty() && std::all_of(name.begin(), name.end(), isNameCharacter);
        const auto isBad = [](char c) { return isControl(c) && c != '\t'; };
        if (!isName || colon == line.size() || std::any_of(line.begin(), line.end(), isBad)) {
            refuse(400, "a line of the head is no header: write NAME: VALUE, on one line");
        }
        headers.emplace(name, trimmed(line.substr(colon + 1)));
    }
    for (const char* const name : singleHeaders) {
        if (headers.count(name) > 1) {
            refuse(400, std::string("the header comes more than once"), name);
        }
    }
    return headers;
}

std::optional<std::string> find(const Headers& headers, const char* name) {
    const auto found = headers.find(name);
    return found == headers.end() ? std::nullopt : std::optional(found->second);
}

/// How long the body is, and what leaves that open.
void readFraming(const Headers& headers, IncomingRequest& incoming) {
    const std::optional<std::string> length = find(headers, "Content-Length");
    const std::optional<std::string> coding = find(headers, "Transfer-Encoding");
    if (coding && (length || *coding != "chunked")) {
        refuse(400, "send the body's length, or the body in chunks");
    }
    if (length) {
        std::size_t size = 0;
        const char* const end = length->data() + length->size();
        const auto [stop, error] = std::from_chars(length->data(), end, size);
        if (error != std::errc() || stop != end) {
            refuse(400, "the body's length is not clear", "Content-Length");
        }
        incoming.length = size;
    }
    if (headers.count("Content-Encoding") > 0) {
        refuse(400, "send the body without a content coding", "Content-Encoding");
    }
    incoming.isChunked = coding.has_value();
    incoming.hasBody = incoming.isChunked || incoming.length.value_or(0) > 0;
}

/// True when the client says of the connection what this word says.
bool saysOfConnection(const Headers& headers, std::string_view word) {
    const auto [first, last] = headers.equal_range("Connection");
    return std::any_of(first, last, [&](const Headers::value_type& header) {
        std::string_view rest = header.second;
        while (!rest.empty()) {
            const std::string_view one = trimmed(takeUntil(rest, ","));
            if (one.size() == word.size() &&
                strncasecmp(one.data(), word.data(), word.size()) == 0) {
                return true;
            }
        }
        return false;
    });
}

void readHead(std::string_view head, IncomingRequest& incoming) {
    std::string_view target;
    const std::string_view version = readRequestLine(takeUntil(head, "\r\n"), incoming, target);
    const Headers headers = readHeaders(head);
    incoming.headers = {find(headers, "Host"), find(headers, "Origin"),
                        find(headers, "Authorization")};
    readTarget(target, incoming);
    incoming.request.lastEventId = find(headers, "Last-Event-ID").value_or("");
    incoming.request.accept = find(headers, "Accept").value_or("");
    incoming.contentType = find(headers, "Content-Type").value_or("");
    readFraming(headers, incoming);
    // Nothing that stands behind chunks, whose form leaves much open, is taken for a request.
    incoming.isLast = incoming.isChunked || saysOfConnection(headers, "close") ||
                      (version == "HTTP/1.0" && !saysOfConnection(headers, "keep-alive"));
}

} // namespace

IncomingRequest RequestHead::read(std::string_view head) {
    IncomingRequest incoming;
    try {
        readHead(head, incoming);
    } catch (const RequestRefused& refused) {
        incoming.problem = refused.problem();
    }
    return incoming;
}
