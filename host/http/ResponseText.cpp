#include "host/http/ResponseText.h"

#include "host/base/TimeText.h"

#include <cstddef>
#include <cstdio>
#include <ctime>
#include <utility>

#include <boost/asio/buffer.hpp>
#include <boost/beast/core/buffers_to_string.hpp>
#include <boost/beast/http/chunk_encode.hpp>
#include <boost/beast/http/empty_body.hpp>
#include <boost/beast/http/message.hpp>
#include <boost/beast/http/serializer.hpp>

namespace zrm::host {

namespace {

constexpr const char* days[] = {"Sun", "Mon", "Tue", "Wed", "Thu", "Fri", "Sat"};
constexpr const char* months[] = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                  "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};

} // namespace

std::string HttpDate::text(std::int64_t seconds) {
    const auto time = static_cast<std::time_t>(seconds);
    std::tm utc{};
    gmtime_r(&time, &utc);
    char buffer[96];
    std::snprintf(buffer, sizeof buffer, "%s, %02d %s %04d %02d:%02d:%02d GMT", days[utc.tm_wday],
                  utc.tm_mday, months[utc.tm_mon], utc.tm_year + 1900, utc.tm_hour, utc.tm_min,
                  utc.tm_sec);
    return buffer;
}

std::string HttpDate::now() {
    return text(WallClock::seconds());
}

namespace {

namespace http = boost::beast::http;

/// Default headers of every answer. Answers are always complete: ranges are not supported.
constexpr std::pair<const char*, const char*> usualHeaders[] = {
    {"Cache-Control", "no-store"},
    {"X-Content-Type-Options", "nosniff"},
    {"Accept-Ranges", "none"},
};
constexpr const char* onlyTls = "max-age=31536000"; ///< browsers use only TLS for a year
constexpr int noContent = 204;

std::string text(const http::response<http::empty_body>& response) {
    http::response_serializer<http::empty_body> serializer(response);
    serializer.split(true); // only the head
    std::string head;
    boost::beast::error_code error;
    while (!serializer.is_header_done() && !error) {
        serializer.next(error, [&](boost::beast::error_code&, const auto& buffers) {
            head += boost::beast::buffers_to_string(buffers);
            serializer.consume(boost::beast::buffer_bytes(buffers));
        });
    }
    return head;
}

} // namespace

std::string ResponseText::head(const HttpAnswer& answer, const Connection& connection) {
    http::response<http::empty_body> response;
    constexpr unsigned http11 = 11;
    response.version(http11);
    response.result(static_cast<unsigned>(answer.status));
    for (const auto& [name, value] : usualHeaders) {
        response.set(name, value);
    }
    if (connection.isTls) {
        response.set(http::field::strict_transport_security, onlyTls);
    }
    response.set(http::field::date, HttpDate::now());
    for (const auto& [name, value] : answer.headers) {
        response.set(name, value); // may replace a default header
    }
    if (answer.status != noContent) {
        response.set(http::field::content_type, answer.contentType);
    }
    if (!answer.stream && answer.status != noContent) {
        response.set(http::field::content_length, std::to_string(answer.body.size()));
    } else if (answer.stream && !connection.isHttp10) {
        response.set(http::field::transfer_encoding, "chunked");
    }
    if (connection.isLast) {
        response.set(http::field::connection, "close");
    } else if (connection.isHttp10) {
        response.set(http::field::connection, "keep-alive");
    }
    return text(response);
}

std::string ResponseText::chunk(const std::string& text) {
    return boost::beast::buffers_to_string(
        http::make_chunk(boost::asio::const_buffer(text.data(), text.size())));
}

std::string ResponseText::lastChunk() {
    return boost::beast::buffers_to_string(http::make_chunk_last());
}

std::string ResponseText::askForBody() {
    http::response<http::empty_body> response;
    response.result(http::status::continue_);
    return text(response);
}

} // namespace zrm::host
