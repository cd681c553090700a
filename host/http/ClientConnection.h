#ifndef ZRM_HOST_CLIENT_CONNECTION_H
#define ZRM_HOST_CLIENT_CONNECTION_H

#include "host/http/ClientSocket.h"

#include <cstddef>
#include <string>
#include <string_view>

/// What goes over one connection: requests in, answers out, one after the other, each with a time
/// by which it must be over. One thread.
class ClientConnection {
public:
    using Clock = ClientSocket::Clock;

    /// How the wait for the head of a request ended.
    enum Head { COMPLETE, NONE, TOO_LONG, TOO_SLOW };

    /// The longest head, with its request line: bytes.
    static constexpr std::size_t largestHead = 16 * 1024;

    /// `socket` outlives the object.
    explicit ClientConnection(ClientSocket& socket) : m_socket(socket) {}

    /// Waits for a request up to `idle`, and for the whole of its head, which is then the next
    /// thing to be read. The time for head and body begins with the first byte.
    Head readHead(std::chrono::milliseconds idle);

    /// The head that was waited for, without the empty line at its end. Until something is read.
    std::string_view head() const { return std::string_view(m_in).substr(0, m_headSize); }

    /// Reads on in the request. The number of bytes; 0 when the client sends no more in time, or
    /// more than any request needs.
    std::size_t read(char* bytes, std::size_t size);

    /// True when the time for head and body is over.
    bool isLate() const { return Clock::now() >= m_requestDeadline; }

    /// Sends a part of an answer. False when the client is gone or takes too long.
    bool write(std::string_view bytes);

    /// The answer goes on for as long as the client takes part.
    void beginStream() noexcept { m_answerDeadline = Clock::time_point::max(); }

    bool isGone() const { return m_socket.isGone(); }

private:
    void refill();
    void dropRanges();

    ClientSocket& m_socket;
    std::string m_in;     ///< received
    std::size_t m_at = 0; ///< of it, what has been read
    std::size_t m_headSize = 0;
    std::size_t m_bodyLeft = 0; ///< bytes behind the head that may still be received
    Clock::time_point m_requestDeadline;
    Clock::time_point m_answerDeadline;
};

#endif
