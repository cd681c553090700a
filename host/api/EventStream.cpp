#include "host/api/EventStream.h"

#include "base/TraceScope.h"
#include "host/api/EventQuery.h"
#include "host/history/HistoryReader.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

#include <algorithm>
#include <atomic>
#include <charconv>
#include <exception>
#include <iterator>
#include <limits>
#include <mutex>
#include <optional>
#include <stop_token>
#include <string>
#include <system_error>
#include <thread>
#include <utility>
#include <vector>

namespace zrm::host {

namespace {

using Clock = std::chrono::steady_clock;

TRC1_Anchor anchor{"EventStream.cpp"};

constexpr std::size_t eventsAtOnce = 200;

/// The id after which a client wants to go on; none when it wants only what is new.
std::optional<std::uint64_t> resumeAfter(const HttpRequest& request, QueryFields& query) {
    constexpr std::uint64_t mostId = std::numeric_limits<std::int64_t>::max();
    const std::optional<std::uint64_t> after = query.number("after", 0, mostId);
    const std::string& last = request.lastEventId;
    if (last.empty()) {
        return after;
    }
    std::uint64_t id = 0;
    const char* const end = last.data() + last.size();
    const auto [stop, error] = std::from_chars(last.data(), end, id);
    if (error != std::errc() || stop != end || id > mostId) {
        throw RequestRefused(400, "the id of an event is a whole number", "Last-Event-ID");
    }
    return id;
}

/// The event behind which the next query goes on.
std::uint64_t lastLookedAt(const EventPage& page, const EventFilter& filter, std::uint64_t newest) {
    const std::uint64_t last = page.events.empty() ? 0 : page.events.back().id;
    if (page.events.size() == filter.limit) {
        return last;
    }
    // A search that was not stopped early has seen all up to the newest, and maybe later ones.
    return page.reached.value_or(std::max(newest, last));
}

std::string messages(const std::vector<StoredEvent>& events) {
    std::string text;
    for (const StoredEvent& event : events) {
        text += "id: " + std::to_string(event.id) + "\nevent: event\ndata: " + event.json + "\n\n";
    }
    return text;
}

} // namespace

/// The clients of a stream, and the thread that serves them.
class EventStream::Followers {
public:
    Followers(HistoryReader* history, std::chrono::milliseconds interval)
        : m_history(history), m_interval(interval) {}
    ~Followers() { finish(); }

    /// Counts a client until what is returned is gone. Null when there are too many.
    std::shared_ptr<void> takePlace();
    std::size_t count() const noexcept { return m_places->load(); }

    /// Starts the thread with the first client; false when the system has none.
    bool start();
    void add(EventFilter filter, std::shared_ptr<void> place, std::shared_ptr<BodyChannel> channel);
    /// A client may take more, or has gone. Never waits for long.
    void wake();
    /// Ends every stream.
    void finish();

private:
    struct Follower {
        EventFilter filter;
        std::shared_ptr<void> place;
        std::shared_ptr<BodyChannel> channel;
        Clock::time_point silent; ///< until then nothing needs to be sent
    };

    void run();
    bool serve(Follower& follower) const;
    Result<std::string> next(Follower& follower) const;
    void waitForChange(const std::vector<Follower>& followers, const std::stop_token& wake) const;

    HistoryReader* const m_history;
    const std::chrono::milliseconds m_interval;
    const std::shared_ptr<std::atomic<std::size_t>> m_places =
        std::make_shared<std::atomic<std::size_t>>(0);

    std::mutex m_mutex;          ///< guards what follows
    std::vector<Follower> m_new; ///< not yet known to the thread
    std::stop_source m_wake;     ///< ends the thread's wait
    bool m_isEnding = false;
    std::thread m_thread;
};

std::shared_ptr<void> EventStream::Followers::takePlace() {
    const bool isTooMany = ++*m_places > mostClients;
    std::shared_ptr<void> place(m_places.get(), [places = m_places](void*) { --*places; });
    return isTooMany ? nullptr : place;
}

bool EventStream::Followers::start() {
    const std::lock_guard guard(m_mutex);
    if (m_isEnding || m_thread.joinable()) {
        return true;
    }
    try {
        m_thread = std::thread(&Followers::run, this);
        return true;
    } catch (const std::system_error&) {
        return false;
    }
}

void EventStream::Followers::add(EventFilter filter, std::shared_ptr<void> place,
                                 std::shared_ptr<BodyChannel> channel) {
    channel->send("retry: 2000\n\n");
    const std::lock_guard guard(m_mutex);
    if (m_isEnding) {
        channel->end();
        return;
    }
    m_new.push_back(
        {std::move(filter), std::move(place), std::move(channel), Clock::now() + m_interval});
    m_wake.request_stop();
}

void EventStream::Followers::wake() {
    const std::lock_guard guard(m_mutex);
    m_wake.request_stop();
}

void EventStream::Followers::finish() {
    {
        const std::lock_guard guard(m_mutex);
        m_isEnding = true;
        m_wake.request_stop();
    }
    if (m_thread.joinable()) {
        m_thread.join();
    }
}

void EventStream::Followers::run() {
    TraceScope trace(anchor);
    std::vector<Follower> followers;
    for (;;) {
        std::stop_token wake;
        {
            const std::lock_guard guard(m_mutex);
            std::move(m_new.begin(), m_new.end(), std::back_inserter(followers));
            m_new.clear();
            if (m_isEnding) {
                break;
            }
            m_wake = std::stop_source(); // what happens from here on ends the next wait
            wake = m_wake.get_token();
        }
        std::erase_if(followers, [&](Follower& follower) { return !serve(follower); });
        waitForChange(followers, wake);
    }
    for (const Follower& follower : followers) {
        follower.channel->end();
    }
}

/// Gives a client what there is for it. False when it no longer follows the stream.
bool EventStream::Followers::serve(Follower& follower) const {
    TraceScope trace(anchor);
    if (!follower.channel->isOpen()) {
        trace.detail()("A client no longer follows the events.");
        return false;
    }
    if (!follower.channel->isReady()) {
        return true;
    }
    try {
        const Result<std::string> text = next(follower);
        if (text) {
            follower.channel->send(*text);
            return true;
        }
        trace.error()("A stream broke off: %s", text.error().text().c_str());
    } catch (const std::exception& exception) {
        trace.error()("A stream broke off: %s", exception.what());
    }
    follower.channel->end();
    return false;
}

Result<std::string> EventStream::Followers::next(Follower& follower) const {
    EventFilter& filter = follower.filter;
    const std::uint64_t newest = m_history->newest();
    std::string text;
    if (newest > filter.after) {
        const Result<EventPage> page = m_history->query(filter);
        if (!page) {
            return tl::unexpected(page.error());
        }
        text = messages(page->events);
        filter.after = lastLookedAt(*page, filter, newest);
    }
    if (text.empty() && Clock::now() >= follower.silent) {
        text = ": keep-alive\n\n";
    }
    if (!text.empty()) {
        follower.silent = Clock::now() + m_interval;
    }
    return text;
}

/// Waits until there are events for a client that can take them, or one needs a sign that the
/// stream is alive, or a client's state has changed.
void EventStream::Followers::waitForChange(const std::vector<Follower>& followers,
                                           const std::stop_token& wake) const {
    std::uint64_t known = std::numeric_limits<std::int64_t>::max();
    Clock::time_point limit = Clock::time_point::max();
    for (const Follower& follower : followers) {
        if (follower.channel->isReady()) {
            known = std::min(known, follower.filter.after);
            limit = std::min(limit, follower.silent);
        }
    }
    m_history->waitBeyond(known, limit, wake);
}

EventStream::EventStream(HistoryReader* history, std::chrono::milliseconds interval)
    : m_history(history), m_followers(std::make_shared<Followers>(history, interval)) {}

EventStream::~EventStream() {
    m_followers->finish();
}

std::size_t EventStream::clients() const noexcept {
    return m_followers->count();
}

void EventStream::addRoutes(Router& router) {
    router.add(
        "GET", "/api/v1/events/stream",
        [this](const HttpRequest& request) { return open(request); }, Router::TOKEN, Router::QUICK);
}

HttpAnswer EventStream::open(const HttpRequest& request) {
    TraceScope trace(anchor);
    HistoryReader& history = EventQuery::history(m_history);
    QueryFields query(request);
    EventFilter filter;
    EventQuery::readKinds(query, filter);
    const std::uint64_t newest = history.newest();
    // Ids beyond the newest are of a history that is gone.
    filter.after = std::min(resumeAfter(request, query).value_or(newest), newest);
    query.refuseUnknown();
    filter.limit = eventsAtOnce;
    filter.newestFirst = false;
    std::shared_ptr<void> place = m_followers->takePlace();
    if (place == nullptr) {
        throw RequestRefused(503,
                             "too many clients are following the events: at most " +
                                 std::to_string(mostClients),
                             "");
    }
    if (!m_followers->start()) { // before the client hears that it follows the events
        throw RequestRefused(503, "the agent has no thread for the stream: try again", "");
    }
    HttpAnswer answer;
    answer.contentType = "text/event-stream";
    answer.stream.begin = [followers = m_followers, filter,
                           place](std::shared_ptr<BodyChannel> channel) {
        followers->add(filter, place, std::move(channel));
    };
    answer.stream.changed = [followers = m_followers] { followers->wake(); };
    return answer;
}

} // namespace zrm::host
