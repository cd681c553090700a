// The manager thread of LogManager: start and stop, main loop, signals and waits.

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "framework/agent_calls.h"
#include "logmgr/LogManager.h"
#include "logs/LogManagerUtil.h"

#include <cstdlib>

#include <pthread.h>
#include <signal.h>
#include <time.h>
#include <unistd.h>

namespace zrm {

namespace {

TRC1_Anchor anchor{"LogManagerThread.cpp"};

constexpr int serverUpSeconds = 10; ///< how long a stop waits for the framework's server

/// Ends the process if a step of starting the manager failed.
void require(const TraceScope& trace, int code, const char* failure, int line = __builtin_LINE()) {
    if (code != 0) {
        const ErrorText error(code);
        trace.error(line)(
            "%s Return code = %d; %s.  Use the return code and message to investigate "
            "the failure.  Agent is terminating.",
            failure, error.number(), error.text());
        std::exit(-1);
    }
}

/// Traces a step of stopping the manager, which continues in any case.
void report(const TraceScope& trace, int code, const char* failure, const char* success,
            int line = __builtin_LINE()) {
    if (code != 0) {
        const ErrorText error(code);
        trace.error(line)("%s Return code = %d; %s", failure, error.number(), error.text());
    } else {
        trace.detail(line)("%s", success);
    }
}

/// Allows cancellation of the manager thread while the object lives, around calls in which the
/// thread waits. Cancellation is disabled everywhere else: it would leak files, locks and
/// half-built chains, and it cannot unwind through the noexcept calls of the trace.
class ManagerCancellation {
public:
    ManagerCancellation() { set(PTHREAD_CANCEL_ENABLE); }
    ~ManagerCancellation() { forbid(); }
    ManagerCancellation(const ManagerCancellation&) = delete;
    ManagerCancellation& operator=(const ManagerCancellation&) = delete;

    /// Disables cancellation of the calling thread. Called at the thread's start.
    static void forbid() { set(PTHREAD_CANCEL_DISABLE); }

private:
    static void set(int state) {
        int previous = 0;
        pthread_setcancelstate(state, &previous);
    }
};

void unlockMutex(void* mutex) {
    pthread_mutex_unlock(static_cast<pthread_mutex_t*>(mutex));
}

} // namespace

void LogManager::startManagerThread() {
    TraceScope trace(anchor);

    pthread_mutexattr_t mutexAttributes;
    require(trace, pthread_mutexattr_init(&mutexAttributes),
            "Error initializing log manager mutex attribute object.");
    require(trace, pthread_mutex_init(&ManagerLock, &mutexAttributes),
            "Error initializing log manager mutex. ");
    trace.detail()("Log manager mutex initialized.");
    require(trace, pthread_mutexattr_destroy(&mutexAttributes),
            "Error destroying log manager mutex attribute object.");

    pthread_condattr_t conditionAttributes;
    require(trace, pthread_condattr_init(&conditionAttributes),
            "Error initializing log manager condition attribute object.");
    require(trace, pthread_cond_init(&ManagerNotInUse, &conditionAttributes),
            "Error initializing log manager in use condition variable.");
    trace.detail()("Log manager 'inuse' condition variable initialized.");
    require(trace, pthread_cond_init(&AgentServerNotUp, &conditionAttributes),
            "Error initializing log manager server status condition variable.");
    trace.detail()("Log manager 'server-up' condition variable initialized.");
    require(trace, pthread_condattr_destroy(&conditionAttributes),
            "Error destroying log manager condition attribute object.");

    pthread_attr_t threadAttributes;
    require(trace, pthread_attr_init(&threadAttributes),
            "Error initializing log manager thread attribute object.");
    if (const int code = pthread_attr_setdetachstate(&threadAttributes, PTHREAD_CREATE_JOINABLE)) {
        const ErrorText error(code);
        trace.error()("Error making log manager thread attribute object joinable. Return code = "
                      "%d; %s.  Continuing.",
                      error.number(), error.text());
    }
    pthread_t thread;
    require(trace, pthread_create(&thread, &threadAttributes, managerThread, this),
            "Error starting manager thread. ");
    ManagerThread = thread;
    require(trace, pthread_attr_destroy(&threadAttributes),
            "Error destroying log manager thread attribute object.");
}

void LogManager::stopManagerThread() {
    TraceScope trace(anchor);
    const pthread_t thread = ManagerThread;
    if (pthread_equal(pthread_self(), thread) == 0) {
        report(trace, pthread_cancel(thread), "Error canceling manager thread.",
               "Termination pending cancelation of manager thread.");
        report(trace, pthread_join(thread, nullptr), "Error joining with manager thread. ",
               "Manager thread terminated.");
    }
    report(trace, pthread_mutex_destroy(&ManagerLock), "Error destroying log manager mutex. ",
           "Log manager mutex destroyed.");
    report(trace, pthread_cond_destroy(&ManagerNotInUse),
           "Error destroying inuse condition variable.", "'inuse' condition variable destroyed.");
    report(trace, pthread_cond_destroy(&AgentServerNotUp),
           "Error destroying server-up condition variable.",
           "'server-up' condition variable destroyed.");
}

void* managerThread(void* argument) {
    TraceScope trace(anchor);
    ManagerCancellation::forbid();
    auto* const manager = static_cast<LogManager*>(argument);
    // The creator stores the same value, but possibly later than this thread needs it.
    manager->ManagerThread = pthread_self();
    trace.detail()("Log manager thread successfully started.");
    while (manager->refresh() != 0 && manager->waitForSignal()) {
    }
    manager->terminateFramework();
    trace.detail()("Log manager thread is terminating.");
    return nullptr;
}

bool LogManager::waitForSignal() {
    TraceScope trace(anchor);
    sigset_t signals;
    sigemptyset(&signals);
    for (const int number : {SIGCHLD, SIGHUP, SIGINT, SIGTERM, SIGQUIT}) {
        sigaddset(&signals, number);
    }
    trace.detail()("Manager thread waiting for a signal.");
    ManagerPulse.rest();
    for (;;) {
        int received = 0;
        int code = 0;
        {
            const ManagerCancellation allowed;
            code = sigwait(&signals, &received);
        }
        if (code != 0) {
            const ErrorText error(code);
            trace.error()("Error while manager waiting for refresh signal. errno = %d; %s",
                          error.number(), error.text());
            return trace.result(false);
        }
        switch (received) {
        case SIGCHLD:
            trace.fine()("SIGCHLD signal ignored.");
            break;
        case SIGHUP:
            trace.detail()("Refresh signal received.");
            return trace.result(true);
        case SIGTERM:
        case SIGINT:
            trace.detail()("Stop signal received.");
            return trace.result(false);
        case SIGQUIT:
            trace.detail()("QUIT signal received. Aborting.");
            std::abort();
        default:
            trace.error()("Manager received unexpected signal.  Signal = %d", received);
            return trace.result(false);
        }
    }
}

void LogManager::sleepUnlessStopped(unsigned seconds) {
    TraceScope trace(anchor);
    ManagerPulse.rest();
    for (; seconds > 0; --seconds) {
        sigset_t pending;
        sigemptyset(&pending);
        sigpending(&pending);
        if (sigismember(&pending, SIGINT) == 1 || sigismember(&pending, SIGTERM) == 1 ||
            sigismember(&pending, SIGQUIT) == 1) {
            waitForSignal();
            return;
        }
        const ManagerCancellation allowed;
        sleep(1);
    }
}

void LogManager::terminateFramework() {
    TraceScope trace(anchor);
    AGF_Stopping();
    trace.detail()("Log manager terminating framework.");
    waitForServer();
    unsigned status = 0;
    RPC1_Shutdown(&status);
    char statusText[2 * sizeof status + 1];
    trace.detail()("Framework terminated with status %s.",
                   LogManagerUtil::xtoa(statusText, &status, sizeof status));
}

void LogManager::waitForServer() {
    TraceScope trace(anchor);
    lockManager();
    while (!AgentServerUp) {
        trace.detail()("Shutdown suspended for up to %d seconds pending completion of server "
                       "initialization.",
                       serverUpSeconds);
        timespec limit;
        clock_gettime(CLOCK_REALTIME, &limit);
        limit.tv_sec += serverUpSeconds;
        if (const int code = waitFor(AgentServerNotUp, &limit)) {
            const ErrorText error(code);
            unlockManager();
            trace.detail()("Wait for server timed out; process is exiting.  Return code = %d %s.  "
                           "Use the return code and message to investigate the failure.  Agent is "
                           "terminating.",
                           error.number(), error.text());
            std::exit(-1);
        }
    }
    trace.detail()("Shutdown resuming.");
    unlockManager();
}

int LogManager::waitFor(pthread_cond_t& condition, const timespec* limit) {
    int code = 0;
    pthread_cleanup_push(unlockMutex, &ManagerLock);
    {
        const ManagerCancellation allowed;
        code = limit == nullptr ? pthread_cond_wait(&condition, &ManagerLock)
                                : pthread_cond_timedwait(&condition, &ManagerLock, limit);
    }
    pthread_cleanup_pop(0);
    return code;
}

} // namespace zrm
