#include "host/http/TlsSocket.h"

#include <algorithm>
#include <limits>
#include <utility>

#include <openssl/err.h>
#include <openssl/ssl.h>
#include <poll.h>

namespace {

int sizeFor(std::size_t size) {
    return static_cast<int>(std::min<std::size_t>(size, std::numeric_limits<int>::max()));
}

} // namespace

TlsSocket::TlsSocket(int fd, const StopSignal& stop, std::shared_ptr<const TlsContext> context)
    : ClientSocket(fd, stop), m_context(std::move(context)),
      m_session(SSL_new(m_context->handle())) {
    m_isBroken = m_session == nullptr || SSL_set_fd(m_session, descriptor()) != 1;
}

TlsSocket::~TlsSocket() {
    SSL_free(m_session);
}

void TlsSocket::sayFarewell() {
    if (!m_isBroken) {
        ERR_clear_error();
        SSL_shutdown(m_session);
    }
    m_isBroken = true; // nothing more is said
}

/// What a call that gave no bytes means: see tryReceive.
ssize_t TlsSocket::notYet(int result, short& wanted) {
    const int error = SSL_get_error(m_session, result);
    if (error == SSL_ERROR_WANT_READ || error == SSL_ERROR_WANT_WRITE) {
        wanted = error == SSL_ERROR_WANT_READ ? POLLIN : POLLOUT;
        return -1;
    }
    m_isBroken = error == SSL_ERROR_SSL || error == SSL_ERROR_SYSCALL;
    return 0;
}

bool TlsSocket::open(Clock::time_point deadline) {
    while (!m_isBroken) {
        ERR_clear_error();
        const int result = SSL_accept(m_session);
        if (result == 1) {
            return true;
        }
        short wanted = 0;
        if (notYet(result, wanted) == 0 || Clock::now() >= deadline ||
            !wait(wanted, deadline, true)) {
            m_isBroken = true; // a session that was not agreed on is not taken leave of
        }
    }
    return false;
}

// The farewell of a client comes as bytes, behind which the end of the connection is not seen.
bool TlsSocket::isGone() {
    if (m_isBroken) {
        return true;
    }
    char byte = 0;
    ERR_clear_error();
    const int count = SSL_peek(m_session, &byte, 1);
    short wanted = 0;
    return count <= 0 && notYet(count, wanted) == 0;
}

ssize_t TlsSocket::tryReceive(char* bytes, std::size_t size, short& wanted) {
    ERR_clear_error();
    const int count = SSL_read(m_session, bytes, sizeFor(size));
    return count > 0 ? count : notYet(count, wanted);
}

ssize_t TlsSocket::trySend(const char* bytes, std::size_t size, short& wanted) {
    ERR_clear_error();
    const int count = SSL_write(m_session, bytes, sizeFor(size));
    return count > 0 ? count : notYet(count, wanted);
}
