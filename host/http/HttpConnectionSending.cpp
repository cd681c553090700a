#include "host/http/HttpConnection.h"

#include "host/http/ResponseText.h"
#include "host/http/StreamChannel.h"

#include <utility>

namespace zrm::host {

// What a connection sends: answers and streams. The rest of it is in HttpConnection.cpp.

namespace {

using namespace std::chrono_literals;
using std::chrono::milliseconds;

constexpr milliseconds sendingTime = 60s;       ///< for an answer that is not a stream
constexpr milliseconds noProgress = 5s;         ///< for a client that takes no data
constexpr milliseconds noProgressAtTheEnd = 1s; ///< the same while the server stops
constexpr milliseconds leavingTime = 1s;

} // namespace

void HttpConnection::write(HttpAnswer answer) {
    m_isLast = m_isLast || m_context.isStopping || (answer.stream && m_isHttp10);
    m_head = ResponseText::head(answer, {m_isLast, m_isHttp10, m_isTls});
    m_body = m_isHead || answer.stream ? "" : std::move(answer.body);
    m_written = 0;
    m_writeLimit = Clock::now() + sendingTime;
    enter(WRITING, progressTime());
    if (answer.stream && !m_isHead) {
        writeParts([this, stream = std::move(answer.stream)] { beginStream(stream); });
    } else {
        writeParts([this] { afterAnswer(); });
    }
}

milliseconds HttpConnection::progressTime() const {
    return m_context.isStopping ? noProgressAtTheEnd : noProgress;
}

/// Sends what is left of head and body.
void HttpConnection::writeParts(std::function<void()> whenWritten) {
    boost::asio::const_buffer head = boost::asio::buffer(m_head);
    boost::asio::const_buffer body = boost::asio::buffer(m_body);
    const std::size_t inBody = m_written > head.size() ? m_written - head.size() : 0;
    head += m_written;
    body += inBody;
    m_stream->write({head, body}, [self = shared_from_this(), whenWritten = std::move(whenWritten)](
                                      const Error& error, std::size_t count) mutable {
        self->onWritten(error, count, std::move(whenWritten));
    });
}

void HttpConnection::onWritten(const Error& error, std::size_t count,
                               std::function<void()> whenWritten) {
    if (m_phase == CLOSED) {
        return;
    }
    if (error) {
        close();
        return;
    }
    m_written += count;
    if (m_written == m_head.size() + m_body.size()) {
        whenWritten();
    } else if (m_phase == WRITING && Clock::now() >= m_writeLimit) {
        close();
    } else {
        if (m_phase != READING_BODY) { // "100 Continue" must not extend the time for the body
            setTimer(progressTime());
        }
        writeParts(std::move(whenWritten));
    }
}

void HttpConnection::afterAnswer() {
    m_head.clear();
    m_body = {}; // it may have been large
    if (m_isLast || m_context.isStopping) {
        leave();
    } else {
        waitForRequest();
    }
}

/// Lets the client read what was sent: ends the sending side and discards what the client still
/// sends, for a short time. Closing at once would destroy data that it has not read yet.
void HttpConnection::leave() {
    enter(LEAVING, leavingTime);
    m_stream->sayFarewell([self = shared_from_this()](const Error&, std::size_t) {
        Error ignored;
        if (self->m_phase == LEAVING) {
            self->m_stream->socket().shutdown(boost::asio::ip::tcp::socket::shutdown_send, ignored);
            self->readMoreOrClose();
        }
    });
}

void HttpConnection::beginStream(const HttpAnswer::Stream& stream) {
    enter(STREAMING, forEver);
    m_isStreamOver = false;
    m_isWritingStream = false;
    m_channel = std::make_shared<StreamChannel>(*this, stream.changed);
    if (m_context.isStopping) {
        stop();
        return;
    }
    readMore();
    stream.begin(m_channel);
}

void HttpConnection::sendInStream(const std::string& text) {
    if (m_phase != STREAMING || m_isStreamOver) {
        return;
    }
    m_streamText += m_isHttp10 ? text : ResponseText::chunk(text);
    m_streamBytes += text.size();
    writeStream();
}

void HttpConnection::endStream() {
    if (m_phase != STREAMING || m_isStreamOver) {
        return;
    }
    m_isStreamOver = true;
    m_streamText += m_isHttp10 ? "" : ResponseText::lastChunk();
    writeStream();
}

void HttpConnection::writeStream() {
    if (m_isWritingStream) {
        return;
    }
    if (m_streamText.empty()) {
        if (m_isStreamOver) {
            dropChannel();
            afterAnswer();
        } else {
            setTimer(forEver);
        }
        return;
    }
    m_isWritingStream = true;
    m_head = std::exchange(m_streamText, {});
    m_body.clear();
    m_written = 0;
    setTimer(progressTime());
    writeParts([this, bytes = std::exchange(m_streamBytes, 0)] {
        m_isWritingStream = false;
        m_head.clear();
        if (m_channel != nullptr) {
            m_channel->taken(bytes);
        }
        writeStream();
    });
}

void HttpConnection::dropChannel() {
    if (const auto channel = std::exchange(m_channel, nullptr)) {
        channel->close();
    }
}

} // namespace zrm::host
