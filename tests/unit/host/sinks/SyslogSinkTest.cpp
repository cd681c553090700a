#include "host/sinks/SyslogSink.h"

#include "LocalSocket.h"
#include "SinkTest.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr int patience = 10'000; ///< milliseconds

/// A receiver's socket on a port of this machine.
class Socket {
public:
    explicit Socket(int type, std::uint16_t wanted = 0)
        : port(wanted), m_socket(localSocket(type, port)) {
        if (type == SOCK_STREAM) {
            listen(m_socket, 16);
        }
    }
    explicit Socket(const Socket& listener) : m_socket(-1) {
        if (listener.hasInput()) {
            m_socket = accept(listener.m_socket, nullptr, nullptr);
        }
    }
    ~Socket() { end(); }
    Socket& operator=(const Socket&) = delete;

    void end() {
        close(m_socket);
        m_socket = -1;
    }
    bool hasInput(int milliseconds = patience) const {
        pollfd descriptor = {m_socket, POLLIN, 0};
        return poll(&descriptor, 1, milliseconds) > 0;
    }
    std::string readSome() const {
        char buffer[65536];
        const ssize_t count = hasInput() ? recv(m_socket, buffer, sizeof buffer, 0) : 0;
        return {buffer, count > 0 ? static_cast<std::size_t>(count) : 0};
    }
    std::string read(std::size_t size) const {
        std::string text;
        while (text.size() < size) {
            const std::string some = readSome();
            if (some.empty()) {
                break;
            }
            text += some;
        }
        return text;
    }
    void write(const std::string& text) const {
        EXPECT_EQ(::send(m_socket, text.data(), text.size(), MSG_NOSIGNAL),
                  static_cast<ssize_t>(text.size()));
    }
    /// Sends what the other side accepts at once; false when it is gone.
    bool talk() const {
        static const std::string text(65536, 'x');
        pollfd descriptor = {m_socket, POLLOUT, 0};
        return poll(&descriptor, 1, 100) == 0 ||
               ::send(m_socket, text.data(), text.size(), MSG_NOSIGNAL | MSG_DONTWAIT) > 0;
    }
    std::uint16_t port = 0;

private:
    int m_socket;
};

class SyslogSinkTest : public testing::Test {
protected:
    SyslogSinkTest() {
        for (const char* const text : {"one", "two", "three"}) {
            events.add({.description = text});
        }
    }
    static SinkConfig config(std::uint16_t port, const std::string& transport = "tcp") {
        return sinkConfig("type = 'syslog'\naddress = '127.0.0.1:" + std::to_string(port) +
                          "'\ntransport = '" + transport + "'\nfacility = 'local0'");
    }
    std::size_t deliver(SyslogSink& sink, std::size_t first, std::size_t count) {
        return sink.deliver(std::span(events.records()).subspan(first, count), giveUp.get_token());
    }
    std::string message(std::size_t index) const {
        return SyslogMessage("local0").text(events.records()[index]);
    }
    std::string frame(std::size_t index) const {
        return std::to_string(message(index).size()) + ' ' + message(index);
    }
    std::string frames(std::size_t first, std::size_t count) const {
        std::string text;
        for (std::size_t index = first; index < first + count; ++index) {
            text += frame(index);
        }
        return text;
    }

    RecordingTrace trace{0};
    EntryEvents events;
    std::stop_source giveUp;
};

TEST_F(SyslogSinkTest, FramesBeginWithTheirLength) {
    const Socket listener(SOCK_STREAM);
    SyslogSink sink(config(listener.port));
    EXPECT_EQ(sink.name(), "syslog 127.0.0.1:" + std::to_string(listener.port));
    EXPECT_EQ(deliver(sink, 0, 2), 2u);
    EXPECT_EQ(deliver(sink, 2, 1), 1u);
    const Socket connection(listener);
    EXPECT_EQ(connection.read(frames(0, 3).size()), frames(0, 3));
}

TEST_F(SyslogSinkTest, WithoutAReceiverThereIsNoDelivery) {
    std::uint16_t port = 0;
    {
        const Socket gone(SOCK_STREAM);
        port = gone.port;
    }
    SyslogSink sink(config(port));
    EXPECT_EQ(deliver(sink, 0, 3), 0u);
    EXPECT_EQ(sink.error(),
              "connect failed: Connection refused (127.0.0.1:" + std::to_string(port) + ")");
    const Socket back(SOCK_STREAM, port);
    EXPECT_EQ(deliver(sink, 0, 3), 3u);
    EXPECT_EQ(Socket(back).read(frames(0, 3).size()), frames(0, 3));
}

TEST_F(SyslogSinkTest, AnUnknownNameIsReported) {
    SinkConfig unknown = config(514);
    unknown.options["address"] = std::string("nowhere.invalid:514");
    SyslogSink sink(unknown);
    EXPECT_EQ(deliver(sink, 0, 3), 0u);
    EXPECT_THAT(sink.error(), testing::StartsWith("nowhere.invalid:514 is not known: "));
}

TEST_F(SyslogSinkTest, TheLastDeliveryIsRepeatedOnANewConnection) {
    const Socket listener(SOCK_STREAM);
    SyslogSink sink(config(listener.port));
    EXPECT_EQ(deliver(sink, 0, 1), 1u);
    EXPECT_EQ(deliver(sink, 1, 1), 1u);
    Socket first(listener);
    EXPECT_EQ(first.read(frames(0, 2).size()), frames(0, 2));
    first.end();
    EXPECT_EQ(deliver(sink, 2, 1), 1u);
    const Socket second(listener);
    EXPECT_EQ(second.read(frames(1, 2).size()), frames(1, 2));
}

TEST_F(SyslogSinkTest, WhatWasNotAcknowledgedIsRepeatedToo) {
    const Socket listener(SOCK_STREAM);
    const std::string large(1500, 'x');
    for (int count = 0; count < 5000; ++count) {
        events.add({.description = large});
    }
    SyslogSink sink(within(100ms, config(listener.port)));
    EXPECT_EQ(deliver(sink, 0, 3), 3u);
    const Socket first(listener);
    EXPECT_EQ(first.read(frames(0, 3).size()), frames(0, 3));
    // The receiver stops reading: what is sent stays in the systems' buffers.
    std::size_t delivered = 3;
    while (deliver(sink, delivered, 10) == 10) {
        delivered += 10;
        ASSERT_LT(delivered, 4900u);
    }
    EXPECT_EQ(sink.error(), "127.0.0.1:" + std::to_string(listener.port) + " takes nothing");
    // It can still read what its system has acknowledged; the rest is sent again.
    std::string seen;
    for (std::string some; !(some = first.readSome()).empty();) {
        seen += some;
    }
    std::string again;
    std::jthread reader([&] {
        const Socket second(listener);
        const std::string last = frame(delivered + 9);
        std::size_t searched = 0;
        while (again.find(last, searched) == std::string::npos) {
            searched = again.size() - std::min(again.size(), last.size());
            const std::string some = second.readSome();
            if (some.empty()) {
                return;
            }
            again += some;
        }
    });
    EXPECT_EQ(deliver(sink, delivered, 10), 10u);
    reader.join();
    std::size_t missing = 3;
    for (std::size_t at = 0; (at = seen.find(frame(missing), at)) != std::string::npos; ++missing) {
    }
    EXPECT_GT(again.size(), frames(delivered, 10).size());
    for (; missing < delivered + 10; ++missing) {
        ASSERT_NE(again.find(frame(missing)), std::string::npos) << missing;
    }
}

TEST_F(SyslogSinkTest, WhatTheReceiverSendsIsDiscarded) {
    const Socket listener(SOCK_STREAM);
    SyslogSink sink(config(listener.port));
    EXPECT_EQ(deliver(sink, 0, 1), 1u);
    const Socket connection(listener);
    connection.write("hello\r\n");
    EXPECT_EQ(deliver(sink, 1, 1), 1u);
    EXPECT_EQ(connection.read(frames(0, 2).size()), frames(0, 2));
}

TEST_F(SyslogSinkTest, AReceiverThatNeverStopsSendingIsDisconnected) {
    const Socket listener(SOCK_STREAM);
    SyslogSink sink(config(listener.port));
    EXPECT_EQ(deliver(sink, 0, 1), 1u);
    auto first = std::make_unique<Socket>(listener);
    std::atomic<bool> isOver{false};
    std::jthread talker([&] {
        while (!isOver && first->talk()) {
        }
        first.reset();
    });
    // However much it sends, each delivery ends, and finally the connection.
    std::size_t again = 0;
    const Clock::time_point limit = Clock::now() + 20s;
    while (!listener.hasInput(0) && Clock::now() < limit) {
        ASSERT_EQ(deliver(sink, 1, 1), 1u);
        ++again;
    }
    isOver = true;
    EXPECT_TRUE(listener.hasInput(0)) << "after " << again << " deliveries";
}

TEST_F(SyslogSinkTest, WhatWasSentArrivesAlthoughTheReceiverHasSentSomething) {
    const Socket listener(SOCK_STREAM);
    for (int count = 0; count < 300; ++count) {
        events.add({.description = std::string(1500, 'x')});
    }
    auto sink = std::make_unique<SyslogSink>(config(listener.port));
    EXPECT_EQ(deliver(*sink, 0, 303), 303u);
    const Socket connection(listener);
    connection.write("hello\r\n");
    sink.reset();
    EXPECT_EQ(connection.read(frames(0, 303).size()), frames(0, 303));
}

TEST_F(SyslogSinkTest, AReceiverThatTakesNothingIsAbandonedOnGiveUp) {
    const Socket listener(SOCK_STREAM);
    const std::string large(1500, 'x');
    for (int count = 0; count < 5000; ++count) {
        events.add({.description = large});
    }
    SyslogSink sink(within(60s, config(listener.port)));
    std::jthread stopper([this] {
        std::this_thread::sleep_for(100ms);
        giveUp.request_stop();
    });
    const Clock::time_point begin = Clock::now();
    EXPECT_EQ(deliver(sink, 0, events.records().size()), 0u);
    EXPECT_LT(Clock::now() - begin, 50s) << "it did not wait for its own limit";
    EXPECT_EQ(sink.error(),
              "the agent is stopping (127.0.0.1:" + std::to_string(listener.port) + ")");
}

TEST_F(SyslogSinkTest, OverUdpEachMessageIsADatagram) {
    const Socket receiver(SOCK_DGRAM);
    SyslogSink sink(config(receiver.port, "udp"));
    EXPECT_EQ(deliver(sink, 0, 2), 2u);
    EXPECT_EQ(deliver(sink, 2, 1), 1u);
    std::vector<std::string> messages;
    for (int count = 0; count < 3; ++count) {
        messages.push_back(receiver.readSome());
    }
    EXPECT_THAT(messages, ElementsAre(message(0), message(1), message(2)));
    EXPECT_FALSE(receiver.hasInput(0));
}

TEST_F(SyslogSinkTest, OverUdpAnUnusedPortIsAFailureOnceItIsReported) {
    std::uint16_t port = 0;
    {
        const Socket gone(SOCK_DGRAM);
        port = gone.port;
    }
    SyslogSink sink(config(port, "udp"));
    // The first datagram is sent; the reply to it makes the second fail.
    const std::size_t delivered = deliver(sink, 0, 3);
    EXPECT_LT(delivered, 3u);
    EXPECT_EQ(sink.error(),
              "send failed: Connection refused (127.0.0.1:" + std::to_string(port) + ")");
    const Socket back(SOCK_DGRAM, port);
    EXPECT_EQ(deliver(sink, delivered, 3 - delivered), 3 - delivered);
    for (std::size_t index = delivered; index < 3; ++index) {
        EXPECT_EQ(back.readSome(), message(index));
    }
}

} // namespace
