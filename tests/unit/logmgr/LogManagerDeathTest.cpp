// Failures of the log manager's start, stop and locks.

#include "LogManagerFixture.h"

#include "AgentDoubles.h"
#include "monitor/LogFile.h"
#include "support/Faults.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <cstdlib>

using namespace zrm;

namespace {

using testing::ExitedWithCode;

/// Failures that end the process, or whose trace shows only in a child.
class LogManagerDeathTest : public LogManagerFixture {
protected:
    LogManagerDeathTest() {
        GTEST_FLAG_SET(death_test_style, "fast");
        trace.setLevel(TRC1_ERROR);
    }
    /// Creates a manager in which one call fails at the start.
    [[noreturn]] void startWithFault(const char* function, int skip) {
        Fault fault(function, EAGAIN, {.skip = skip});
        manager = std::make_unique<LogManager>();
        std::_Exit(0);
    }
    /// Ends a manager in which one call fails. The child ends without checking for leaks, because a
    /// failed call leaves its object behind.
    [[noreturn]] void stopWithFault(const char* function, int skip) {
        manager = std::make_unique<LogManager>();
        manager->setServerUp();
        waitUntil([] { return AgentDoubles::shutdowns() == 1; });
        {
            Fault fault(function, EAGAIN, {.skip = skip});
            manager.reset();
        }
        std::_Exit(0);
    }

    FakeSleep sleeps;
};

struct StartFault {
    const char* function;
    int skip;
    const char* message;
};

constexpr StartFault startFaults[] = {
    {"pthread_mutexattr_init", 0, "initializing log manager mutex attribute object\\."},
    {"pthread_mutex_init", 0, "initializing log manager mutex\\. "},
    {"pthread_mutexattr_destroy", 0, "destroying log manager mutex attribute object\\."},
    {"pthread_condattr_init", 0, "initializing log manager condition attribute object\\."},
    {"pthread_cond_init", 0, "initializing log manager in use condition variable\\."},
    {"pthread_cond_init", 1, "initializing log manager server status condition variable\\."},
    {"pthread_condattr_destroy", 0, "destroying log manager condition attribute object\\."},
    {"pthread_attr_init", 0, "initializing log manager thread attribute object\\."},
    {"pthread_create", 0, "starting manager thread\\. "},
};

TEST_F(LogManagerDeathTest, AFailingStartEndsTheProcess) {
    for (const StartFault& fault : startFaults) {
        EXPECT_EXIT(startWithFault(fault.function, fault.skip), ExitedWithCode(255),
                    std::string("^Error ") + fault.message +
                        " Return code = 11; Resource temporarily unavailable\\.  Use the return "
                        "code and message to investigate the failure\\.  Agent is "
                        "terminating\\.\n$");
    }
}

TEST_F(LogManagerDeathTest, ThreadAttributesThatCannotBeDestroyedEndTheProcess) {
    // The manager thread may already be running.
    EXPECT_EXIT(startWithFault("pthread_attr_destroy", 0), ExitedWithCode(255),
                "Error destroying log manager thread attribute object\\. Return code = 11; "
                "Resource temporarily unavailable\\.  Use the return code and message to "
                "investigate the failure\\.  Agent is terminating\\.\n");
}

TEST_F(LogManagerDeathTest, RunningOutOfMemoryForThePathsEndsTheProcess) {
    setenv("ZRM_CONFIG_FILE", "/etc/zrm", 1);
    EXPECT_EXIT(
        {
            Fault fault("new", ENOMEM);
            manager = std::make_unique<LogManager>();
            std::_Exit(0);
        },
        ExitedWithCode(255),
        "^Memory allocation failed for 9 bytes; errno = 12; Cannot allocate memory\n$");
}

TEST_F(LogManagerDeathTest, AFailingLockEndsTheProcess) {
    EXPECT_EXIT(
        {
            configure(a + "\n");
            trace.setLevel(TRC1_DETAIL);
            start();
            trace.setLevel(TRC1_ERROR);
            Fault fault("pthread_mutex_lock", EINVAL);
            manager->beginRequest();
            std::_Exit(0);
        },
        ExitedWithCode(255),
        "Error locking log manager\\.  Return code = 22; Invalid argument\\.  Use the return code "
        "and message to investigate the failure\\.  Agent is terminating\\.\n$");
}

TEST_F(LogManagerDeathTest, AFailingUnlockEndsTheProcess) {
    EXPECT_EXIT(
        {
            configure(a + "\n");
            trace.setLevel(TRC1_DETAIL);
            start();
            trace.setLevel(TRC1_ERROR);
            Fault fault("pthread_mutex_unlock", EPERM);
            manager->beginRequest();
            std::_Exit(0);
        },
        ExitedWithCode(255),
        "Error unlocking log manager\\.  Return code = 1; Operation not permitted\\.  Use the "
        "return code and message to investigate the failure\\.  Agent is terminating\\.\n$");
}

constexpr StartFault stopFaults[] = {
    {"pthread_cancel", 0, "Error canceling manager thread\\."},
    {"pthread_join", 0, "Error joining with manager thread\\. "},
    {"pthread_mutex_destroy", 0, "Error destroying log manager mutex\\. "},
    {"pthread_cond_destroy", 0, "Error destroying inuse condition variable\\."},
    {"pthread_cond_destroy", 1, "Error destroying server-up condition variable\\."},
};

TEST_F(LogManagerDeathTest, AFailingStopContinues) {
    // The thread has already ended: it would wait forever if its cancellation failed.
    for (const StartFault& fault : stopFaults) {
        EXPECT_EXIT(stopWithFault(fault.function, fault.skip), ExitedWithCode(0),
                    std::string("Agent has no work to do\\.  Exiting\\.\\.\\.\n") + fault.message +
                        " Return code = 11; Resource temporarily unavailable\n$");
    }
}

TEST_F(LogManagerDeathTest, ADebugLogThatCannotBeClosedIsTracedWithoutItsPath) {
    EXPECT_EXIT(
        {
            setDebugLog(directory.file("debug.log"));
            manager = std::make_unique<LogManager>();
            manager->setServerUp();
            waitUntil([] { return AgentDoubles::shutdowns() == 1; });
            {
                Fault fault("fclose", EIO);
                manager.reset();
            }
            std::_Exit(0);
        },
        ExitedWithCode(0), "\nError closing debug log \"\"; errno = 5; Input/output error\n$");
}

TEST_F(LogManagerDeathTest, AChainShorterThanItsCountEndsTheProcess) {
    EXPECT_EXIT(
        {
            configure(a + "\n" + b + "\n" + c + "\n");
            trace.setLevel(TRC1_DETAIL);
            start();
            trace.setLevel(TRC1_ERROR);
            manager->findLogObject(b.c_str())->removeFromChain();
            manager.reset();
            std::_Exit(0);
        },
        ExitedWithCode(255),
        "\nLog object chain corrupted\\. Expected number of logs = 3; actual number = 2\\. Agent "
        "is terminating\\.\n$");
}

TEST_F(LogManagerDeathTest, AChainLongerThanItsCountEndsTheProcess) {
    EXPECT_EXIT(
        {
            configure(a + "\n" + b + "\n");
            trace.setLevel(TRC1_DETAIL);
            start();
            trace.setLevel(TRC1_ERROR);
            const auto stranger = strangerBehind(manager->getNextLogObject(nullptr, 0));
            manager.reset();
            std::_Exit(0);
        },
        ExitedWithCode(255),
        "\nLog object chain corrupted\\. Expected number of logs = 2; actual number = 3\\. Agent "
        "is terminating\\.\n$");
}

} // namespace
