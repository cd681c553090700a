#ifndef ZRM_HOST_REQUEST_DISPATCHER_H
#define ZRM_HOST_REQUEST_DISPATCHER_H

#include "host/http/Message.h"
#include "host/http/RequestGuard.h"
#include "host/http/RequestParser.h"
#include "host/http/RequestRefused.h"
#include "host/http/RequestStatistics.h"
#include "host/http/Router.h"

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

namespace zrm::host {

/// Counts the requests in progress, so that process exit can wait for them. Any thread.
class ActiveRequests {
public:
    /// One request while it exists; false when no more requests may begin.
    class Guard {
    public:
        explicit Guard(ActiveRequests& requests);
        ~Guard();
        Guard(const Guard&) = delete;
        Guard& operator=(const Guard&) = delete;
        explicit operator bool() const noexcept { return m_isCounted; }

    private:
        ActiveRequests& m_requests;
        bool m_isCounted;
    };

    /// Prevents new requests and waits for those of other threads, until the limit at the latest.
    void close(std::chrono::steady_clock::time_point limit);

private:
    std::mutex m_mutex;
    std::condition_variable m_ended;
    int m_count = 0;
    bool m_isClosed = false;
};

/// Holds the rules of access against requests and lets the router's handlers answer them. What
/// goes wrong becomes a problem document. Any thread.
class RequestDispatcher {
public:
    /// The largest body: bytes.
    /// For an answer; requests that may read a whole log have longLimit. What does not end then
    /// gets endingTime, and is left behind (TimedWork).
    static constexpr std::chrono::milliseconds limit{4000};
    static constexpr std::chrono::milliseconds longLimit{32'000};
    static constexpr std::chrono::milliseconds endingTime{800};

    static constexpr std::size_t largestBody = 1024 * 1024;

    /// A request whose head was held against the rules. What may wait comes after that: the body,
    /// and the handler.
    struct Admission {
        HttpRequest request;
        const Router::Handler* handler = nullptr;
        Router::Lane lane = Router::USUAL;
        std::string method; ///< as it was sent
        std::string route;
        std::chrono::steady_clock::time_point begin;
        std::optional<HttpAnswer> refusal; ///< the answer, where a rule speaks against the request
        /// Whether its answer is in the statistics: a handler may end after the request was refused
        /// for taking too long. Shared by the threads that may answer.
        std::shared_ptr<std::atomic<bool>> isCounted = std::make_shared<std::atomic<bool>>(false);
    };

    /// `router` outlives the object.
    explicit RequestDispatcher(const Router& router) : m_router(router) {}

    /// Before the first request, and whenever the token or the certificate has changed.
    void setGuard(RequestGuard guard);

    /// Judges a request by its head. Throws nothing and never waits.
    Admission admit(IncomingRequest incoming);

    /// Lets the handler of a request that was not refused answer it. Throws nothing.
    HttpAnswer answer(Admission& admission);

    /// The answer to a request that was admitted and cannot be answered otherwise.
    HttpAnswer refuse(const Admission& admission, const Refusal& refusal);

    /// The answer to a request of which not even the head could be read.
    HttpAnswer refuse(const Refusal& refusal);

    /// What refuses a body that is too long.
    static RequestRefused tooLong();

    /// The answer that is a problem document.
    static HttpAnswer answerOf(const Refusal& refusal);

    /// Lets no more requests be answered and waits for those under way, at most until the limit.
    void close(std::chrono::steady_clock::time_point limit) { m_active.close(limit); }

    /// What was answered so far.
    const RequestStatistics& statistics() const noexcept { return m_statistics; }

private:
    void tryAdmit(IncomingRequest& incoming, Admission& admission);
    /// Counts the first answer to a request.
    void count(const Admission& admission, const HttpAnswer& answer);
    std::shared_ptr<const RequestGuard> guard();

    const Router& m_router;
    std::mutex m_mutex;
    std::shared_ptr<const RequestGuard> m_guard; ///< guarded by the mutex
    ActiveRequests m_active;
    RequestStatistics m_statistics;
};

} // namespace zrm::host

#endif
