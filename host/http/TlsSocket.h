#ifndef ZRM_HOST_TLS_SOCKET_H
#define ZRM_HOST_TLS_SOCKET_H

#include "host/http/ClientSocket.h"
#include "host/http/TlsContext.h"

#include <memory>

struct ssl_st;

/// The socket of a client that speaks TLS. One thread.
class TlsSocket : public ClientSocket {
public:
    /// As ClientSocket.
    TlsSocket(int fd, const StopSignal& stop, std::shared_ptr<const TlsContext> context);
    ~TlsSocket() override;

    bool open(Clock::time_point deadline) override;

    bool isGone() override;

protected:
    void sayFarewell() override;
    ssize_t tryReceive(char* bytes, std::size_t size, short& wanted) override;
    ssize_t trySend(const char* bytes, std::size_t size, short& wanted) override;

private:
    ssize_t notYet(int result, short& wanted);

    const std::shared_ptr<const TlsContext> m_context;
    ssl_st* const m_session;
    bool m_isBroken = false; ///< nothing can be said any more, not even a farewell
};

#endif
