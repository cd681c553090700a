#include "host/http/ClientConnection.h"

#include <algorithm>

#include <strings.h>

namespace {

using namespace std::chrono_literals;

constexpr auto requestTime = 10s; ///< for head and body together
constexpr auto answerTime = 60s;  ///< for an answer that is no stream
/// Behind a head: a body in chunks of a few bytes each is several times as long as what it says.
constexpr std::size_t mostBehindHead = 8 * 1024 * 1024;
constexpr std::size_t pieceSize = 4096; ///< received at a time
constexpr std::string_view headEnd = "\r\n\r\n";

/// Takes away what some clients send behind a body.
void dropEmptyLines(std::string& in) {
    std::size_t size = 0;
    while (in.compare(size, 2, "\r\n") == 0) {
        size += 2;
    }
    in.erase(0, size);
}

} // namespace

ClientConnection::Head ClientConnection::readHead(std::chrono::milliseconds idle) {
    m_in.erase(0, m_at);
    m_at = 0;
    m_requestDeadline = Clock::now() + (m_in.empty() ? idle : requestTime);
    for (bool hasBegun = !m_in.empty();;) {
        dropEmptyLines(m_in);
        const std::size_t end = m_in.find(headEnd);
        if (end <= largestHead) { // and found
            m_headSize = end;
            dropRanges();
            m_answerDeadline = m_requestDeadline + answerTime;
            m_bodyLeft = mostBehindHead;
            return COMPLETE;
        }
        if (m_in.size() > largestHead) {
            return TOO_LONG;
        }
        char bytes[pieceSize];
        ClientSocket::Outcome outcome{};
        const std::size_t count = m_socket.receive(bytes, sizeof bytes, m_requestDeadline, outcome);
        if (count == 0) {
            return hasBegun && outcome == ClientSocket::TIMEOUT ? TOO_SLOW : NONE;
        }
        if (!hasBegun) {
            hasBegun = true;
            m_requestDeadline = Clock::now() + requestTime;
        }
        m_in.append(bytes, count);
    }
}

// Answers are given whole. The library would examine the header with a recursion as deep as its
// value is long.
void ClientConnection::dropRanges() {
    constexpr std::string_view name = "range:";
    for (std::size_t line = m_in.find("\r\n"); line < m_headSize;) {
        const std::size_t next = m_in.find("\r\n", line + 2);
        if (strncasecmp(m_in.data() + line + 2, name.data(), name.size()) == 0) {
            m_in.erase(line, next - line);
            m_headSize -= next - line;
        } else {
            line = next;
        }
    }
}

// The library reads the sizes of chunks byte by byte.
void ClientConnection::refill() {
    m_in.resize(std::min(pieceSize, m_bodyLeft));
    m_at = 0;
    ClientSocket::Outcome outcome{};
    m_in.resize(
        m_in.empty() ? 0 : m_socket.receive(m_in.data(), m_in.size(), m_requestDeadline, outcome));
    m_bodyLeft -= m_in.size();
}

std::size_t ClientConnection::read(char* bytes, std::size_t size) {
    if (m_at == m_in.size()) {
        refill();
    }
    const std::size_t count = std::min(size, m_in.size() - m_at);
    std::copy_n(m_in.data() + m_at, count, bytes);
    m_at += count;
    return count;
}

bool ClientConnection::write(std::string_view bytes) {
    return m_socket.send(bytes, m_answerDeadline);
}
