#ifndef ZRM_HOST_STREAM_CHANNEL_H
#define ZRM_HOST_STREAM_CHANNEL_H

#include "host/http/Message.h"

#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>
#include <string>

namespace zrm::host {

class HttpConnection;

/// The channel of a stream over a connection, which may end before the channel.
class StreamChannel : public BodyChannel {
public:
    /// `changed` is as in HttpAnswer::Stream; may be empty.
    StreamChannel(HttpConnection& connection, std::function<void()> changed);

    void send(std::string text) override;
    bool isReady() const override;
    bool isOpen() const override;
    void end() override;

    // For the connection.

    /// The client has taken this many of the bytes sent.
    void taken(std::size_t bytes);
    /// The connection is gone.
    void close();

private:
    template <class Work> void inConnection(Work work);

    mutable std::mutex m_mutex;   ///< guards the members below
    HttpConnection* m_connection; ///< null: closed
    std::size_t m_unsent = 0;     ///< bytes sent and not yet taken by the client
    const std::function<void()> m_changed;
};

} // namespace zrm::host

#endif
