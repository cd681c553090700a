// The host's implementation of EventRoom.h, and its own side of it.
#include "framework/EventRoom.h"

#include "host/framework/EventRoomControl.h"

#include <condition_variable>
#include <mutex>

using namespace zrm::host;

namespace {

using Clock = std::chrono::steady_clock;

/// How often a waiting thread checks whether its row is still wanted.
constexpr std::chrono::milliseconds lookInterval{250};

struct Room {
    std::mutex mutex;
    std::condition_variable changed;
    bool isHeld = false;
    bool isFull = false;
    bool isClosed = false;
    unsigned waiting = 0;          ///< threads waiting because the queue is full
    Clock::duration begins{};      ///< sum of the times at which their waits began
    EventRoomControl::Waits ended; ///< total time of finished waits; number of all waits
    std::atomic<std::uint64_t> passedOver{0};
};

/// Never destroyed: log threads may still wait while the process exits.
Room& room() {
    static auto* const theRoom = new Room;
    return *theRoom;
}

template <typename Change> void change(Change&& change) {
    {
        const std::lock_guard guard(room().mutex);
        change(room());
        using enum EventRoom::State;
        EventRoom::state.store(room().isClosed ? CLOSED
                               : room().isHeld ? HELD
                               : room().isFull ? FULL
                                               : FREE);
    }
    room().changed.notify_all();
}

} // namespace

std::atomic<EventRoom::State> EventRoom::state{EventRoom::State::FREE};

EventRoom::State EventRoom::wait(const std::function<bool()>& isWanted) {
    Room& all = room();
    std::unique_lock lock(all.mutex);
    const auto isDecided = [] { return now() == State::FREE || now() == State::CLOSED; };
    if (isDecided()) {
        return now();
    }
    const bool isCounted = now() == State::FULL;
    const Clock::duration begin = Clock::now().time_since_epoch();
    if (isCounted) {
        ++all.ended.count;
        ++all.waiting;
        all.begins += begin;
    }
    while (isWanted() && !all.changed.wait_for(lock, lookInterval, isDecided)) {
    }
    if (isCounted) {
        --all.waiting;
        all.begins -= begin;
        all.ended.waited += Clock::now().time_since_epoch() - begin;
    }
    return now();
}

void EventRoom::notePassedOver(std::uint64_t entries) noexcept {
    room().passedOver.fetch_add(entries);
}

void EventRoomControl::hold() {
    change([](Room& all) { all.isHeld = true; });
}

void EventRoomControl::open() {
    change([](Room& all) {
        all.isHeld = all.isClosed = false;
        all.passedOver = 0;
    });
}

void EventRoomControl::close() {
    change([](Room& all) { all.isClosed = true; });
}

void EventRoomControl::setFull(bool isFull) {
    change([&](Room& all) { all.isFull = isFull; });
}

EventRoomControl::Waits EventRoomControl::waits() {
    const std::lock_guard guard(room().mutex);
    Waits waits = room().ended;
    waits.waited += room().waiting * Clock::now().time_since_epoch() - room().begins;
    return waits;
}

std::uint64_t EventRoomControl::passedOver() noexcept {
    return room().passedOver.load();
}
