#include "host/client/NameLookup.h"

#include <condition_variable>
#include <cstring>
#include <mutex>
#include <thread>
#include <utility>

#include <netdb.h>
#include <netinet/in.h>

namespace zrm::host {

struct NameLookup::Answer {
    int code = 0; ///< error code of getaddrinfo
    std::vector<SocketAddress> addresses;
};

/// A lookup on its own thread, which may outlive all its callers.
struct NameLookup::Lookup {
    std::mutex mutex;
    std::condition_variable_any changed;
    bool isDone = false;
    Answer answer;
};

std::string SocketAddress::text() const {
    char digits[NI_MAXHOST];
    return getnameinfo(pointer(), size, digits, sizeof digits, nullptr, 0, NI_NUMERICHOST) == 0
               ? digits
               : std::string();
}

NameLookup::NameLookup(std::string host, std::uint16_t port)
    : m_host(std::move(host)), m_port(port) {}

NameLookup::~NameLookup() = default;

NameLookup::Answer NameLookup::ask(const std::string& host, std::uint16_t port, int flags) {
    Answer answer;
    addrinfo wanted{};
    wanted.ai_flags = flags;
    wanted.ai_socktype = SOCK_STREAM; // each address once; datagrams have the same addresses
    addrinfo* list = nullptr;
    answer.code = getaddrinfo(host.c_str(), std::to_string(port).c_str(), &wanted, &list);
    if (answer.code != 0) {
        return answer;
    }
    for (const addrinfo* found = list; found != nullptr; found = found->ai_next) {
        SocketAddress& address = answer.addresses.emplace_back();
        std::memcpy(&address.address, found->ai_addr, found->ai_addrlen);
        address.size = found->ai_addrlen;
    }
    freeaddrinfo(list);
    return answer;
}

std::vector<SocketAddress> NameLookup::find(Clock::time_point limit,
                                            const std::stop_token& giveUp) {
    if (Answer digits = ask(m_host, m_port, AI_NUMERICHOST); digits.code == 0) {
        return std::move(digits.addresses); // a numeric address needs no lookup
    }
    if (m_underWay == nullptr) {
        auto lookup = std::make_shared<Lookup>();
        std::thread([lookup, host = m_host, port = m_port] {
            Answer answer = ask(host, port, 0);
            const std::lock_guard guard(lookup->mutex);
            lookup->answer = std::move(answer);
            lookup->isDone = true;
            lookup->changed.notify_all();
        }).detach();
        m_underWay = std::move(lookup);
    }
    const std::shared_ptr<Lookup> lookup = m_underWay;
    std::unique_lock lock(lookup->mutex);
    if (!lookup->changed.wait_until(lock, giveUp, limit, [&] { return lookup->isDone; })) {
        m_error = "the system is still looking its name up";
        return {};
    }
    m_underWay.reset();
    if (lookup->answer.code != 0) {
        m_error = gai_strerror(lookup->answer.code);
    }
    return std::move(lookup->answer.addresses);
}

} // namespace zrm::host
