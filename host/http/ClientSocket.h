#ifndef ZRM_HOST_CLIENT_SOCKET_H
#define ZRM_HOST_CLIENT_SOCKET_H

#include "host/http/StopSignal.h"

#include <chrono>
#include <cstddef>
#include <string_view>

#include <sys/types.h>

/// The socket of one client: every wait has an end. One thread.
class ClientSocket {
public:
    using Clock = std::chrono::steady_clock;

    /// What became of a wait for bytes, where none came.
    enum Outcome { CLOSED, TIMEOUT, STOPPED };

    /// Takes the descriptor over. `stop` outlives the object.
    ClientSocket(int fd, const StopSignal& stop);
    virtual ~ClientSocket();
    ClientSocket(const ClientSocket&) = delete;
    ClientSocket& operator=(const ClientSocket&) = delete;

    /// Whatever goes before the first byte of a request. False when the client does not do its
    /// part until the deadline.
    virtual bool open(Clock::time_point deadline);

    /// Receives what is there, after a wait at most until the deadline or the stop. The number of
    /// bytes, at least 1; 0 when there are none, for the reason in `outcome`.
    std::size_t receive(char* bytes, std::size_t size, Clock::time_point deadline,
                        Outcome& outcome);

    /// Sends all bytes, until the deadline. It is brought forward when the client takes none for
    /// five seconds, or one second where the server stops. False when not all were sent.
    bool send(std::string_view bytes, Clock::time_point deadline);

    /// True when the client has closed the connection, as far as that can be seen.
    virtual bool isGone();

    /// Lets the client have what was sent: says that there is no more, and throws away what it
    /// still sends, for a short time.
    void linger();

protected:
    /// Whatever is said before the connection is closed for sending.
    virtual void sayFarewell() {}

    /// The number of bytes; 0 when the client has closed the connection, or it is broken; -1 when
    /// there are none yet: `wanted` is then what to wait for with poll.
    virtual ssize_t tryReceive(char* bytes, std::size_t size, short& wanted);
    virtual ssize_t trySend(const char* bytes, std::size_t size, short& wanted);

    /// Waits for events of poll. False at the deadline, or when the stop comes first and
    /// `heedsStop`.
    bool wait(short events, Clock::time_point deadline, bool heedsStop) const;

    int descriptor() const noexcept { return m_fd; }

private:
    const int m_fd;
    const StopSignal& m_stop;
};

#endif
