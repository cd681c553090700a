#include "host/http/StreamChannel.h"

#include "host/http/HttpConnection.h"

#include <utility>

#include <boost/asio/post.hpp>

namespace zrm::host {

StreamChannel::StreamChannel(HttpConnection& connection, std::function<void()> changed)
    : m_connection(&connection), m_changed(std::move(changed)) {}

/// Runs work on the connection's own thread, if the connection still exists then. The mutex is
/// held.
template <class Work> void StreamChannel::inConnection(Work work) {
    if (m_connection == nullptr) {
        return;
    }
    if (auto connection = m_connection->weak_from_this().lock()) {
        auto executor = connection->m_stream->socket().get_executor();
        boost::asio::post(executor, [connection = std::move(connection), work = std::move(work)] {
            work(*connection);
        });
    }
}

void StreamChannel::send(std::string text) {
    if (text.empty()) {
        return;
    }
    const std::lock_guard guard(m_mutex);
    m_unsent += text.size();
    inConnection(
        [text = std::move(text)](HttpConnection& connection) { connection.sendInStream(text); });
}

void StreamChannel::end() {
    const std::lock_guard guard(m_mutex);
    inConnection([](HttpConnection& connection) { connection.endStream(); });
}

bool StreamChannel::isReady() const {
    const std::lock_guard guard(m_mutex);
    return m_connection != nullptr && m_unsent == 0;
}

bool StreamChannel::isOpen() const {
    const std::lock_guard guard(m_mutex);
    return m_connection != nullptr;
}

void StreamChannel::taken(std::size_t bytes) {
    {
        const std::lock_guard guard(m_mutex);
        m_unsent -= bytes;
        if (m_unsent > 0) {
            return;
        }
    }
    if (m_changed) {
        m_changed();
    }
}

void StreamChannel::close() {
    {
        const std::lock_guard guard(m_mutex);
        m_connection = nullptr;
    }
    if (m_changed) {
        m_changed();
    }
}

} // namespace zrm::host
