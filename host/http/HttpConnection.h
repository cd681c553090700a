#ifndef ZRM_HOST_HTTP_CONNECTION_H
#define ZRM_HOST_HTTP_CONNECTION_H

#include "host/http/ClientStream.h"
#include "host/http/ConnectionShares.h"
#include "host/http/RequestDispatcher.h"
#include "host/http/RequestParser.h"
#include "host/http/WorkerPool.h"

#include <array>
#include <atomic>
#include <chrono>
#include <cstddef>
#include <functional>
#include <memory>
#include <optional>
#include <stop_token>
#include <string>

#include <boost/asio/steady_timer.hpp>

namespace zrm::host {

class StreamChannel;

/// What the connections of a server share. Must outlive them.
struct ConnectionContext {
    RequestDispatcher& dispatcher;
    WorkerPool& workers;      ///< for Router::USUAL
    WorkerPool& quickWorkers; ///< for Router::QUICK
    ConnectionShares& shares;
    std::atomic<bool> isStopping{false};
};

/// One client's connection: requests in, answers out, one after the other, each with a deadline.
/// Nothing here blocks: each step begins when the previous one is done or its time is up.
/// Everything runs on the one thread of the socket's executor, except the request handlers, which
/// run on workers.
class HttpConnection : public std::enable_shared_from_this<HttpConnection> {
public:
    /// The most requests served over one connection.
    static constexpr std::size_t requestsPerConnection = 1000;

    /// `address` is the client's; its place in ConnectionShares has been taken.
    HttpConnection(ConnectionContext& context, std::unique_ptr<ClientStream> stream, bool isTls,
                   std::string address);
    ~HttpConnection();
    HttpConnection(const HttpConnection&) = delete;
    HttpConnection& operator=(const HttpConnection&) = delete;

    void start();
    /// The server stops: the current answer is still sent, everything else ends now.
    void stop();
    /// The current answer is no longer needed; streams end.
    void cancel();
    /// Closes the connection at once.
    void close();

private:
    friend class StreamChannel;
    enum class Phase {
        OPENING,
        IDLE,
        READING_HEAD,
        READING_BODY,
        WAITING_FOR_WORKER,
        ANSWERING,
        CANCELLED,
        WRITING,
        STREAMING,
        LEAVING,
        CLOSED
    };
    using enum Phase;
    struct Job;
    using Error = ClientStream::Error;
    using Clock = std::chrono::steady_clock;
    static constexpr std::chrono::milliseconds forEver = std::chrono::milliseconds::max();

    void enter(Phase phase, std::chrono::milliseconds time);
    void setTimer(std::chrono::milliseconds time);
    void onTime();

    void readMore();
    void onRead(const Error& error, std::size_t count);
    void onEnd();
    void readMoreOrClose();

    void waitForRequest();
    void parseHead();
    void beginBody();
    void parseBody();
    void take(std::size_t count);

    void submit();
    void onWaitTimeOver();
    void answered(const std::shared_ptr<Job>& job, HttpAnswer answer);
    void refuseJob(const Refusal& refusal);

    void write(HttpAnswer answer);
    void writeParts(std::function<void()> whenWritten);
    void onWritten(const Error& error, std::size_t count, std::function<void()> whenWritten);
    std::chrono::milliseconds progressTime() const;
    void afterAnswer();

    void beginStream(const HttpAnswer::Stream& stream);
    void sendInStream(const std::string& text);
    void endStream();
    void writeStream();
    void dropChannel();

    void leave();

    ConnectionContext& m_context;
    const std::unique_ptr<ClientStream> m_stream;
    const bool m_isTls;
    const std::string m_address;
    boost::asio::steady_timer m_timer;
    Phase m_phase = OPENING;

    std::array<char, 4096> m_piece; ///< buffer for one read
    bool m_isReading = false;
    bool m_isEnded = false;    ///< the client sends no more data
    std::string m_in;          ///< received and not yet parsed
    std::size_t m_dropped = 0; ///< bytes discarded while closing

    std::optional<RequestParser> m_parser;
    std::size_t m_requests = 0;
    std::size_t m_bodyBytes = 0; ///< received after the head
    bool m_isLast = false;       ///< the connection ends after the answer
    bool m_isHead = false;       ///< the answer has no body
    bool m_isHttp10 = false;
    bool m_waitsForContinue = false;
    std::optional<RequestDispatcher::Admission> m_admission;
    std::shared_ptr<Job> m_job;

    std::string m_head; ///< head of the answer being written
    std::string m_body;
    std::size_t m_written = 0; ///< bytes written of head and body
    Clock::time_point m_writeLimit;

    std::shared_ptr<StreamChannel> m_channel;
    std::string m_streamText;      ///< as chunks, not yet being written
    std::size_t m_streamBytes = 0; ///< of these, the payload bytes
    bool m_isWritingStream = false;
    bool m_isStreamOver = false;
};

} // namespace zrm::host

#endif
