#include "host/history/RequestedChanges.h"

#include "host/history/Database.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

Result<void> RequestedChanges::make(Change change, std::chrono::milliseconds longest) {
    const auto request = std::make_shared<Request>(Request{std::move(change), std::nullopt});
    {
        const std::lock_guard guard(m_mutex);
        if (m_hasEnded) {
            return refused("the history has ended");
        }
        m_waiting.push_back(request);
    }
    m_wake();
    std::unique_lock lock(m_mutex);
    if (m_answered.wait_for(lock, longest, [&] { return request->result.has_value(); })) {
        return std::move(*request->result);
    }
    if (std::erase(m_waiting, request) == 0) {
        return refused("the history is being written for long", "look whether the change was made");
    }
    return refused("the history cannot be written now", "try again");
}

bool RequestedChanges::areWaiting() const {
    const std::lock_guard guard(m_mutex);
    return !m_waiting.empty();
}

/// Null when none waits.
RequestedChanges::Shared RequestedChanges::next() {
    const std::lock_guard guard(m_mutex);
    if (m_waiting.empty()) {
        return nullptr;
    }
    Shared request = std::move(m_waiting.front());
    m_waiting.pop_front();
    return request;
}

void RequestedChanges::answer(const Shared& request, Result<void> result) {
    {
        const std::lock_guard guard(m_mutex);
        request->result = std::move(result);
    }
    m_answered.notify_all();
}

void RequestedChanges::run(HistoryFile& file) {
    while (const Shared request = next()) {
        try {
            request->change(file);
            answer(request, {});
        } catch (const DatabaseError& error) {
            answer(request, refused(std::string("the history cannot be written: ") + error.what()));
            throw;
        }
    }
}

void RequestedChanges::refuseAll(const std::string& why) {
    while (const Shared request = next()) {
        answer(request, refused("the history cannot be written: " + why));
    }
}

void RequestedChanges::end() {
    {
        const std::lock_guard guard(m_mutex);
        m_hasEnded = true;
    }
    refuseAll("it has ended");
}

} // namespace zrm::host
