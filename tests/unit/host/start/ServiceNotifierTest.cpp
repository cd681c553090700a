#include "host/start/ServiceNotifier.h"

#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <string>

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/// What a service manager listens on; "@name" is an abstract one.
class ManagerSocket {
public:
    explicit ManagerSocket(const std::string& address)
        : m_fd(socket(AF_UNIX, SOCK_DGRAM | SOCK_NONBLOCK, 0)) {
        sockaddr_un own{};
        own.sun_family = AF_UNIX;
        std::memcpy(own.sun_path, address.data(), address.size());
        if (address[0] == '@') {
            own.sun_path[0] = '\0';
        }
        const auto length =
            static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + address.size());
        EXPECT_EQ(bind(m_fd, reinterpret_cast<const sockaddr*>(&own), length), 0);
    }
    ~ManagerSocket() { close(m_fd); }
    ManagerSocket(const ManagerSocket&) = delete;
    ManagerSocket& operator=(const ManagerSocket&) = delete;

    /// The next message, which has arrived when its sender returns; "" when there is none.
    std::string next() {
        char message[100];
        const ssize_t length = recv(m_fd, message, sizeof message, 0);
        return {message, length > 0 ? static_cast<std::size_t>(length) : 0};
    }

private:
    int m_fd;
};

class ServiceNotifierTest : public testing::Test {
protected:
    ~ServiceNotifierTest() override { unsetenv("NOTIFY_SOCKET"); }

    TemporaryDirectory m_directory;
};

TEST_F(ServiceNotifierTest, ReportsStartAndStopToTheSocketOfTheEnvironment) {
    const std::string path = m_directory.file("notify");
    ManagerSocket manager(path);
    setenv("NOTIFY_SOCKET", path.c_str(), 1);
    const ServiceNotifier notifier = ServiceNotifier::takeFromEnvironment();
    EXPECT_EQ(manager.next(), "");
    notifier.ready();
    EXPECT_EQ(manager.next(), "READY=1");
    notifier.stopping();
    EXPECT_EQ(manager.next(), "STOPPING=1");
    EXPECT_EQ(manager.next(), "");
}

TEST_F(ServiceNotifierTest, HidesTheSocketFromChildren) {
    setenv("NOTIFY_SOCKET", m_directory.file("notify").c_str(), 1);
    ServiceNotifier::takeFromEnvironment();
    EXPECT_EQ(getenv("NOTIFY_SOCKET"), nullptr);
}

TEST_F(ServiceNotifierTest, SupportsAbstractSockets) {
    const std::string name = "@zrm-notify-" + std::to_string(getpid());
    ManagerSocket manager(name);
    ServiceNotifier(name).ready();
    EXPECT_EQ(manager.next(), "READY=1");
}

TEST_F(ServiceNotifierTest, SendsNothingWithoutAServiceManager) {
    RecordingTrace trace(TRC1_ERROR);
    unsetenv("NOTIFY_SOCKET");
    ServiceNotifier::takeFromEnvironment().ready();
    setenv("NOTIFY_SOCKET", "", 1);
    ServiceNotifier::takeFromEnvironment().stopping();
    ServiceNotifier().ready();
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(ServiceNotifierTest, AManagerThatIsGoneIsTraced) {
    RecordingTrace trace(TRC1_ERROR);
    const std::string path = m_directory.file("gone");
    ServiceNotifier(path).ready();
    EXPECT_THAT(trace.messages(), ElementsAre("Cannot tell the service manager READY=1 at " + path +
                                              ". errno = 2; No such file or directory."));
}

TEST_F(ServiceNotifierTest, AnInvalidAddressIsTraced) {
    RecordingTrace trace(TRC1_ERROR);
    const std::string longPath = "/" + std::string(sizeof sockaddr_un{}.sun_path, 'x');
    ServiceNotifier(longPath).stopping();
    ServiceNotifier("vsock:2:1").ready();
    EXPECT_THAT(trace.messages(),
                ElementsAre("Cannot tell the service manager STOPPING=1 at " + longPath +
                                ". errno = 22; Invalid argument.",
                            "Cannot tell the service manager READY=1 at vsock:2:1. errno = 22; "
                            "Invalid argument."));
}

} // namespace
