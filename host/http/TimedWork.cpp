#include "host/http/TimedWork.h"

#include "host/http/RequestRefused.h"

#include <atomic>
#include <future>
#include <system_error>
#include <thread>
#include <utility>

namespace zrm::host {

namespace {

constexpr int mostLeftBehind = 64;

std::atomic<int> leftBehind{0};

} // namespace

HttpAnswer TimedWork::answer(std::function<HttpAnswer()> work, std::chrono::milliseconds limit) {
    if (leftBehind.load() >= mostLeftBehind) {
        throw RequestRefused(503, "the agent is busy: requests are waiting for a file system", "");
    }
    auto promise = std::make_shared<std::promise<HttpAnswer>>();
    auto isLate = std::make_shared<std::atomic<bool>>(false);
    std::future<HttpAnswer> future = promise->get_future();
    try {
        std::thread([promise, isLate, work = std::move(work)] {
            promise->set_value(work());
            if (isLate->exchange(true)) {
                --leftBehind;
            }
        }).detach();
    } catch (const std::system_error&) {
        throw RequestRefused(503, "the agent has no thread for the request: try again", "");
    }
    if (future.wait_for(limit) == std::future_status::timeout) {
        ++leftBehind;
        if (isLate->exchange(true)) {
            --leftBehind; // it has just ended
        } else {
            throw RequestRefused(503, "the agent is busy: there was no answer in time", "");
        }
    }
    return future.get();
}

} // namespace zrm::host
