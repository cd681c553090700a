#include "host/http/HttpConnection.h"

#include "base/TraceScope.h"
#include "host/http/ResponseText.h"
#include "host/http/StreamChannel.h"

#include <utility>

#include <boost/asio/post.hpp>

namespace zrm::host {

namespace {

using namespace std::chrono_literals;
using std::chrono::milliseconds;

TRC1_Anchor anchor{"HttpConnection.cpp"};

constexpr milliseconds openTime = 10s; ///< for what goes before the first request
constexpr milliseconds idleTime = 15s;
constexpr milliseconds idleTimeWhenTight = 1s;       ///< where there is little room for others
constexpr milliseconds requestTime = 10s;            ///< for head and body together
constexpr milliseconds workerTime = 3s;              ///< until a worker takes the request
constexpr milliseconds answerTime = 60s;             ///< for the handler
constexpr milliseconds cancelledTime = 2s;           ///< for a handler to end early
constexpr std::size_t mostDropped = 4 * 1024 * 1024; ///< bytes
/// Received behind a head: a body in chunks of a few bytes each is several times as long as what it
/// says.
constexpr std::size_t mostBehindHead = 8 * 1024 * 1024;
constexpr std::size_t mostUnparsed = 16 * 1024; ///< no part of a body is longer, besides its data
constexpr std::size_t mostAhead = 16 * 1024;    ///< of requests behind the one under way

const Refusal bodyIncomplete{400, "the body is incomplete", "body"};

} // namespace

/// A request on its way to a worker and back. Whoever claims it first has it: the worker, or the
/// connection that does not wait any longer.
struct HttpConnection::Job {
    RequestDispatcher::Admission admission;
    std::stop_source cancel;
    std::atomic<bool> isClaimed{false};
    bool claim() noexcept { return !isClaimed.exchange(true); }
};

HttpConnection::HttpConnection(ConnectionContext& context, std::unique_ptr<ClientStream> stream,
                               bool isTls, std::string address)
    : m_context(context), m_stream(std::move(stream)), m_isTls(isTls),
      m_address(std::move(address)), m_timer(m_stream->socket().get_executor()) {}

HttpConnection::~HttpConnection() {
    if (m_job != nullptr) {
        m_job->cancel.request_stop();
    }
    dropChannel();
    Error ignored;
    m_stream->socket().close(ignored);
    m_context.shares.release(m_address);
}

void HttpConnection::start() {
    Error ignored;
    m_stream->socket().set_option(boost::asio::ip::tcp::no_delay(true), ignored);
    enter(OPENING, openTime);
    m_stream->open([self = shared_from_this()](const Error& error, std::size_t) {
        if (self->m_phase == OPENING) {
            error ? self->close() : self->waitForRequest();
        }
    });
}

void HttpConnection::enter(Phase phase, milliseconds time) {
    m_phase = phase;
    setTimer(time);
}

void HttpConnection::setTimer(milliseconds time) {
    if (time == forEver) {
        m_timer.expires_at(Clock::time_point::max());
        return;
    }
    m_timer.expires_after(time);
    m_timer.async_wait([weak = weak_from_this()](const Error& error) {
        const auto self = weak.lock();
        // The wait may have been over when the timer was set anew.
        if (!error && self != nullptr && self->m_timer.expiry() <= Clock::now()) {
            self->onTime();
        }
    });
}

void HttpConnection::onTime() {
    switch (m_phase) {
    case READING_HEAD:
        m_isLast = true;
        write(m_context.dispatcher.refuse({408, "the request did not arrive within 10 s", ""}));
        break;
    case READING_BODY:
        m_isLast = true;
        write(m_context.dispatcher.refuse(*m_admission,
                                          {408, "the request did not arrive within 10 s", "body"}));
        break;
    case WAITING_FOR_WORKER:
        onWaitTimeOver();
        break;
    case ANSWERING:
        m_job->cancel.request_stop();
        enter(CANCELLED, cancelledTime);
        break;
    case CANCELLED:
        refuseJob({503, "the request took longer than 60 s; ask for less", ""});
        break;
    default:
        close();
    }
}

void HttpConnection::close() {
    if (m_phase == CLOSED) {
        return;
    }
    m_phase = CLOSED;
    if (m_job != nullptr) {
        m_job->cancel.request_stop();
        m_job.reset();
    }
    dropChannel();
    m_timer.cancel();
    Error ignored;
    m_stream->socket().close(ignored);
}

void HttpConnection::cancel() {
    if (m_job != nullptr) {
        m_job->cancel.request_stop();
    } else if (m_phase == STREAMING) {
        stop();
    }
}

void HttpConnection::stop() {
    switch (m_phase) {
    case WAITING_FOR_WORKER:
    case ANSWERING:
    case CANCELLED:
        m_isLast = true;
        m_job->cancel.request_stop();
        break;
    case WRITING:
        m_isLast = true;
        setTimer(progressTime());
        break;
    case STREAMING:
        dropChannel();
        setTimer(progressTime());
        endStream();
        break;
    case LEAVING:
        break;
    default:
        close();
    }
}

// ------------------------------------------------------------------------------------ receiving

void HttpConnection::readMore() {
    if (m_isReading || m_isEnded) {
        return;
    }
    m_isReading = true;
    m_stream->read(boost::asio::buffer(m_piece),
                   [self = shared_from_this()](const Error& error, std::size_t count) {
                       self->m_isReading = false;
                       self->onRead(error, count);
                   });
}

void HttpConnection::onRead(const Error& error, std::size_t count) {
    if (m_phase == CLOSED) {
        return;
    }
    if (error) {
        m_isEnded = true;
        onEnd();
        return;
    }
    const std::string_view bytes(m_piece.data(), count);
    switch (m_phase) {
    case IDLE:
        enter(READING_HEAD, requestTime);
        m_in += bytes;
        parseHead();
        break;
    case READING_HEAD:
        m_in += bytes;
        parseHead();
        break;
    case READING_BODY:
        m_in += bytes;
        parseBody();
        break;
    case STREAMING:
        readMore(); // only to see the client go
        break;
    case LEAVING:
        m_dropped += count;
        m_dropped < mostDropped ? readMore() : close();
        break;
    default: // the next request, while one is under way
        m_in += bytes;
        if (m_phase != WRITING && m_in.size() < mostAhead) {
            readMore();
        }
    }
}

/// The client sends no more, or is gone altogether.
void HttpConnection::onEnd() {
    switch (m_phase) {
    case READING_BODY:
        m_isLast = true;
        write(m_context.dispatcher.refuse(*m_admission, bodyIncomplete));
        break;
    case WAITING_FOR_WORKER:
    case ANSWERING:
    case CANCELLED:
        // Most clients that end their side have gone. One that has not gets what there is.
        m_job->cancel.request_stop();
        break;
    case WRITING:
        break;
    default:
        close();
    }
}

void HttpConnection::waitForRequest() {
    m_parser.emplace();
    m_admission.reset();
    m_isHead = false;
    m_isHttp10 = false;
    m_bodyBytes = 0;
    if (m_in.empty()) {
        enter(IDLE, m_context.shares.isTight() ? idleTimeWhenTight : idleTime);
        m_isEnded ? close() : readMore();
        return;
    }
    enter(READING_HEAD, requestTime);
    parseHead();
}

void HttpConnection::take(std::size_t count) {
    m_in.erase(0, count);
}

void HttpConnection::parseHead() {
    if (!m_parser->hasBegun()) { // some clients send empty lines behind a body
        std::size_t size = 0;
        while (m_in.compare(size, 2, "\r\n") == 0) {
            size += 2;
        }
        take(size);
        if (m_in.empty() || m_in == "\r") {
            readMoreOrClose();
            return;
        }
    }
    take(m_parser->put(m_in));
    if (!m_parser->isHeadDone()) {
        readMoreOrClose();
        return;
    }
    IncomingRequest incoming = m_parser->takeHead();
    const bool hasBody = incoming.hasBody;
    m_isLast = incoming.isLast || incoming.refusal || ++m_requests >= requestsPerConnection ||
               m_context.isStopping;
    m_isHead = incoming.request.method == "HEAD";
    m_isHttp10 = incoming.isHttp10;
    m_waitsForContinue = incoming.waitsForContinue;
    m_admission = m_context.dispatcher.admit(std::move(incoming));
    if (m_admission->refusal) {
        m_isLast = m_isLast || hasBody; // what is left unread is never taken for a request
        write(std::move(*m_admission->refusal));
    } else if (hasBody) {
        beginBody();
    } else {
        submit();
    }
}

void HttpConnection::readMoreOrClose() {
    m_isEnded ? close() : readMore();
}

void HttpConnection::beginBody() {
    m_phase = READING_BODY; // within the time of the head
    m_parser->limitBody(RequestDispatcher::largestBody);
    if (m_waitsForContinue && m_in.empty()) {
        m_head = ResponseText::askForBody();
        m_body.clear();
        m_written = 0;
        writeParts([this] { parseBody(); });
        return;
    }
    parseBody();
}

void HttpConnection::parseBody() {
    while (!m_parser->isDone() && !m_parser->bodyRefusal()) {
        const std::size_t count = m_parser->put(m_in);
        m_bodyBytes += count;
        take(count);
        if (count == 0) {
            break;
        }
    }
    if (m_parser->isDone()) {
        m_admission->request.body = m_parser->takeBody();
        submit();
    } else if (m_parser->bodyRefusal() || m_isEnded || m_bodyBytes > mostBehindHead ||
               m_in.size() > mostUnparsed) {
        m_isLast = true;
        const Refusal refusal = m_parser->bodyRefusal().value_or(bodyIncomplete);
        write(m_context.dispatcher.refuse(*m_admission, refusal));
    } else {
        readMore();
    }
}

// ------------------------------------------------------------------------------------ answering

void HttpConnection::submit() {
    const auto job = std::make_shared<Job>();
    job->admission = std::move(*m_admission);
    job->admission.request.cancelled = job->cancel.get_token();
    m_job = job;
    enter(WAITING_FOR_WORKER, workerTime);
    WorkerPool& workers =
        job->admission.lane == Router::QUICK ? m_context.quickWorkers : m_context.workers;
    const bool isTaken = workers.submit([self = shared_from_this(), job]() mutable {
        if (!job->claim()) {
            return;
        }
        HttpAnswer answer = self->m_context.dispatcher.answer(job->admission);
        auto executor = self->m_stream->socket().get_executor();
        boost::asio::post(executor, [self = std::move(self), job = std::move(job),
                                     answer = std::move(answer)]() mutable {
            self->answered(job, std::move(answer));
        });
    });
    if (!isTaken) {
        onWaitTimeOver();
    } else if (m_in.size() < mostAhead) {
        readMore(); // to see the client go
    }
}

void HttpConnection::onWaitTimeOver() {
    if (!m_job->claim()) {
        enter(ANSWERING, answerTime - workerTime);
        return;
    }
    TraceScope trace(anchor);
    trace.detail()("Every worker is busy: %s was refused.", m_job->admission.request.path.c_str());
    refuseJob({503, "the agent is busy with other requests: try again in a few seconds", ""});
}

void HttpConnection::refuseJob(const Refusal& refusal) {
    const std::shared_ptr<Job> job = std::move(m_job);
    m_job.reset();
    HttpAnswer answer = m_context.dispatcher.refuse(job->admission, refusal);
    answer.headers.emplace_back("Retry-After", "5");
    write(std::move(answer));
}

void HttpConnection::answered(const std::shared_ptr<Job>& job, HttpAnswer answer) {
    if (m_job != job) {
        return; // it came too late
    }
    m_job.reset();
    write(std::move(answer));
}

} // namespace zrm::host
