#include "host/http/RequestParser.h"

#include "host/http/RequestDispatcher.h"
#include "host/http/RequestRefused.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <string>
#include <utility>

#include <strings.h>

#include <boost/asio/buffer.hpp>
#include <boost/beast/http/parser.hpp>
#include <boost/beast/http/string_body.hpp>

namespace zrm::host {

namespace {

namespace http = boost::beast::http;
using Message = http::request<http::string_body>;

constexpr std::array methods = {"GET",   "HEAD",    "POST",    "PUT",  "DELETE",
                                "PATCH", "OPTIONS", "CONNECT", "TRACE"};

/// Headers that decide something: each comes once, or it is open which one decides.
constexpr std::array singleHeaders = {http::field::host,
                                      http::field::origin,
                                      http::field::authorization,
                                      http::field::content_type,
                                      http::field::content_length,
                                      http::field::transfer_encoding,
                                      http::field::content_encoding};
constexpr const char* lastEventId = "Last-Event-ID";

[[noreturn]] void refuse(int status, std::string detail, std::string field = "") {
    throw RequestRefused(status, std::move(detail), std::move(field));
}

std::string text(boost::beast::string_view view) {
    return {view.data(), view.size()};
}

bool isSame(std::string_view left, std::string_view right) {
    return left.size() == right.size() && strncasecmp(left.data(), right.data(), left.size()) == 0;
}

/// Watches the lines of a head go by, for what the message does not show any more.
class HeadLines {
public:
    /// Takes the next bytes of the head.
    void add(std::string_view bytes) {
        for (const char c : bytes) {
            if (m_size == 0 && m_lines > 0 && (c == ' ' || c == '\t')) {
                isFolded = true;
            }
            if (m_size < m_begin.size()) {
                m_begin[m_size] = c;
            }
            ++m_size;
            if (c == '\n') {
                endLine();
            }
        }
        total += bytes.size();
    }

    std::size_t total = 0; ///< bytes
    bool isFolded = false; ///< a header goes on in the next line
    bool isTooLong = false;

private:
    void endLine() {
        constexpr std::size_t lineEnd = 2;
        const bool isRange = isSame({m_begin.data(), m_begin.size()}, "range:");
        isTooLong =
            isTooLong || (m_lines > 0 && !isRange && m_size > RequestParser::largestLine + lineEnd);
        ++m_lines;
        m_size = 0;
    }

    std::array<char, 6> m_begin{}; ///< of the line
    std::size_t m_size = 0;        ///< of the line so far
    std::size_t m_lines = 0;
};

/// What the parser's refusal means to a client.
Refusal refusalOf(const boost::beast::error_code& code) {
    using http::error;
    if (code == error::header_limit) {
        return {431,
                "the head has more than " + std::to_string(RequestParser::largestHead) + " bytes",
                ""};
    }
    if (code == error::bad_content_length || code == error::multiple_content_length) {
        return {400, "the body's length is not clear", "Content-Length"};
    }
    if (code == error::bad_transfer_encoding) {
        return {400, "send the body's length, or the body in chunks", ""};
    }
    if (code == error::bad_field || code == error::bad_value || code == error::bad_line_ending ||
        code == error::bad_obs_fold) {
        return {400, "a line of the head is not a header: write NAME: VALUE, on one line", ""};
    }
    return {400, "the request cannot be read as HTTP", ""};
}

/// Takes "http://HOST:PORT" off a target that has it; what it names is then the request's host.
void takeAuthority(std::string_view& target, std::optional<std::string>& host) {
    for (const std::string_view scheme : {"http://", "https://"}) {
        if (target.size() > scheme.size() && isSame(target.substr(0, scheme.size()), scheme)) {
            target.remove_prefix(scheme.size());
            const std::size_t end = std::min(target.find_first_of("/?"), target.size());
            host = target.substr(0, end);
            target.remove_prefix(end);
            return;
        }
    }
}

void readTarget(std::string_view target, IncomingRequest& incoming) {
    if (target.size() > RequestParser::largestTarget) {
        refuse(414, "path and query have more than " +
                        std::to_string(RequestParser::largestTarget) + " bytes");
    }
    takeAuthority(target, incoming.headers.host);
    target = target.substr(0, target.find('#'));
    const std::size_t end = std::min(target.find('?'), target.size());
    incoming.request.path = target.substr(0, end);
    incoming.rawQuery = target.substr(std::min(end + 1, target.size()));
}

template <class Name> std::optional<std::string> find(const Message& message, Name name) {
    const auto found = message.find(name);
    return found == message.end() ? std::nullopt : std::optional(text(found->value()));
}

/// The parser takes the first of several headers, and more forms of a length than one.
void checkSingle(const Message& message) {
    const auto refuseTwice = [](const std::string& name) {
        refuse(400, "the header appears more than once", name);
    };
    for (const http::field name : singleHeaders) {
        if (message.count(name) > 1) {
            refuseTwice(text(http::to_string(name)));
        }
    }
    if (message.count(lastEventId) > 1) {
        refuseTwice(lastEventId);
    }
}

/// How long the body is, and what leaves that open.
void readFraming(const Message& message, IncomingRequest& incoming) {
    const std::optional<std::string> length = find(message, http::field::content_length);
    const std::optional<std::string> coding = find(message, http::field::transfer_encoding);
    constexpr unsigned http11 = 11;
    if (coding && (length || *coding != "chunked" || message.version() != http11)) {
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
    if (message.count(http::field::content_encoding) > 0) {
        refuse(400, "send the body without a content coding", "Content-Encoding");
    }
    incoming.isChunked = coding.has_value();
    incoming.hasBody = incoming.isChunked || incoming.length.value_or(0) > 0;
}

void readMessage(const Message& message, bool livesOn, IncomingRequest& incoming) {
    checkSingle(message);
    incoming.headers = {find(message, http::field::host), find(message, http::field::origin),
                        find(message, http::field::authorization)};
    const auto target = message.target();
    readTarget({target.data(), target.size()}, incoming);
    incoming.request.lastEventId = find(message, lastEventId).value_or("");
    incoming.request.accept = find(message, http::field::accept).value_or("");
    incoming.contentType = find(message, http::field::content_type).value_or("");
    readFraming(message, incoming);
    constexpr unsigned http11 = 11;
    incoming.isHttp10 = message.version() != http11;
    incoming.waitsForContinue =
        !incoming.isHttp10 &&
        isSame(find(message, http::field::expect).value_or(""), "100-continue");
    // Nothing that stands behind chunks, whose form leaves much open, is taken for a request.
    incoming.isLast = incoming.isChunked || !livesOn;
}

} // namespace

class RequestParser::Engine {
public:
    Engine() {
        m_parser.header_limit(RequestParser::largestHead + 4); // with the empty line
        m_parser.body_limit(boost::none); // what refuses a long body comes behind other rules
    }

    std::size_t put(std::string_view bytes);
    bool hasBegun() const noexcept { return m_lines.total > 0; }
    bool isHeadDone() const noexcept { return m_headRefusal || m_parser.is_header_done(); }
    bool isDone() const noexcept { return m_parser.is_done(); }
    IncomingRequest takeHead();
    void limitBody(std::size_t most) {
        m_parser.body_limit(most);
        m_parser.eager(true);
    }
    const std::optional<Refusal>& bodyRefusal() const noexcept { return m_bodyRefusal; }
    std::string takeBody() { return std::move(m_parser.get().body()); }

private:
    std::size_t putHead(std::string_view bytes);

    http::request_parser<http::string_body> m_parser;
    HeadLines m_lines;
    std::optional<Refusal> m_headRefusal;
    std::optional<Refusal> m_bodyRefusal;
};

std::size_t RequestParser::Engine::put(std::string_view bytes) {
    if (bytes.empty() || isDone() || m_headRefusal || m_bodyRefusal) {
        return 0;
    }
    if (!m_parser.is_header_done()) {
        return putHead(bytes);
    }
    // The parser takes it for granted that it never sees less than the end of a body in chunks when
    // it has begun to look for that end.
    constexpr std::size_t endOfChunks = 5;
    if (m_parser.chunked() && bytes.size() < endOfChunks) {
        return 0;
    }
    boost::beast::error_code error;
    const std::size_t taken =
        m_parser.put(boost::asio::const_buffer(bytes.data(), bytes.size()), error);
    if (error == http::error::body_limit) {
        m_bodyRefusal = RequestDispatcher::tooLong().refusal();
    } else if (error && error != http::error::need_more) {
        m_bodyRefusal = Refusal{400, "the body is incomplete", "body"};
    }
    return taken;
}

std::size_t RequestParser::Engine::putHead(std::string_view bytes) {
    boost::beast::error_code error;
    const std::size_t taken =
        m_parser.put(boost::asio::const_buffer(bytes.data(), bytes.size()), error);
    m_lines.add(bytes.substr(0, taken));
    constexpr std::size_t emptyLine = 4; // with the end of the line before it
    const bool isEnded = m_parser.is_header_done();
    const std::size_t seen = m_lines.total + (isEnded ? 0 : bytes.size() - taken);
    const std::size_t end = isEnded ? emptyLine : emptyLine - 1; // of which a part may be there
    if (seen > largestHead + end) {
        error = http::error::header_limit;
    }
    if (error && error != http::error::need_more) {
        m_headRefusal = refusalOf(error);
    } else if (isEnded && m_lines.isFolded) {
        m_headRefusal = refusalOf(http::error::bad_obs_fold);
    } else if (isEnded && m_lines.isTooLong) {
        m_headRefusal =
            Refusal{431, "a header has more than " + std::to_string(largestLine) + " bytes", ""};
    }
    return taken;
}

IncomingRequest RequestParser::Engine::takeHead() {
    IncomingRequest incoming;
    const Message& message = m_parser.get();
    const std::string method = text(message.method_string());
    const bool isKnown = std::find(methods.begin(), methods.end(), method) != methods.end();
    incoming.request.method = isKnown ? method : "";
    incoming.refusal = m_headRefusal;
    if (!incoming.refusal && !isKnown) {
        incoming.refusal = Refusal{400, "the request cannot be read as HTTP", ""};
    }
    if (!incoming.refusal) {
        try {
            readMessage(message, m_parser.keep_alive(), incoming);
        } catch (const RequestRefused& refused) {
            incoming.refusal = refused.refusal();
        }
    }
    return incoming;
}

RequestParser::RequestParser() : m_engine(std::make_unique<Engine>()) {}

RequestParser::~RequestParser() = default;

std::size_t RequestParser::put(std::string_view bytes) {
    return m_engine->put(bytes);
}

bool RequestParser::hasBegun() const noexcept {
    return m_engine->hasBegun();
}

bool RequestParser::isHeadDone() const noexcept {
    return m_engine->isHeadDone();
}

bool RequestParser::isDone() const noexcept {
    return m_engine->isDone();
}

IncomingRequest RequestParser::takeHead() {
    return m_engine->takeHead();
}

void RequestParser::limitBody(std::size_t most) {
    m_engine->limitBody(most);
}

const std::optional<Refusal>& RequestParser::bodyRefusal() const noexcept {
    return m_engine->bodyRefusal();
}

std::string RequestParser::takeBody() {
    return m_engine->takeBody();
}

} // namespace zrm::host
