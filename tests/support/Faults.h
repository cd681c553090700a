#ifndef ZRM_TESTS_FAULTS_H
#define ZRM_TESTS_FAULTS_H

#include <ctime>
#include <functional>
#include <string>

#include <sys/types.h>

/// Makes calls of the C library fail for real. The test programs are linked with --wrap for every
/// call listed in tests/support/CMakeLists.txt, so the product's own code runs unchanged.

/// While it lives, the next calls of one function fail: as the function fails (-1 and errno, a
/// null pointer and errno, or an error code as the result). Thread-safe. The function is named as
/// in C, or "new" for the nothrow operators new.
///
///     Fault fault("open", EACCES);             // the next call fails
///     Fault fault("read", EIO, {.skip = 2});   // two calls pass, the third fails
struct FaultPlan {
    int skip = 0;  ///< calls that pass first
    int times = 1; ///< calls that fail then; -1: all
};

class Fault {
public:
    Fault(std::string function, int error, FaultPlan plan = {});
    ~Fault();
    Fault(const Fault&) = delete;
    Fault& operator=(const Fault&) = delete;

    /// Number of calls that failed so far.
    int failed() const;
    /// Number of calls seen so far, failed or passed.
    int calls() const;

private:
    std::string m_function;
};

/// While it lives, time() gives the time set here and never moves by itself.
class FakeClock {
public:
    explicit FakeClock(std::time_t now);
    ~FakeClock();
    FakeClock(const FakeClock&) = delete;
    FakeClock& operator=(const FakeClock&) = delete;
    void set(std::time_t now);
};

/// While it lives, sleep() returns at once and remembers the seconds asked for.
class FakeSleep {
public:
    FakeSleep();
    ~FakeSleep();
    FakeSleep(const FakeSleep&) = delete;
    FakeSleep& operator=(const FakeSleep&) = delete;
    unsigned requested() const;
};

/// While it lives, a timed wait on a condition times out at once, with its mutex still held.
class FakeTimedWait {
public:
    FakeTimedWait();
    ~FakeTimedWait();
    FakeTimedWait(const FakeTimedWait&) = delete;
    FakeTimedWait& operator=(const FakeTimedWait&) = delete;
    /// Seconds from the last wait's call to its limit, rounded.
    long requested() const;
};

/// The next sigwait() gives this signal at once.
class FakeSignal {
public:
    explicit FakeSignal(int number);
    ~FakeSignal();
    FakeSignal(const FakeSignal&) = delete;
    FakeSignal& operator=(const FakeSignal&) = delete;
};

/// While it lives, uname() reports these names.
class FakeUname {
public:
    explicit FakeUname(std::string system, std::string node = "testhost");
    ~FakeUname();
    FakeUname(const FakeUname&) = delete;
    FakeUname& operator=(const FakeUname&) = delete;
};

/// While it lives, stat() reports this preferred block size.
class FakeBlockSize {
public:
    explicit FakeBlockSize(long size);
    ~FakeBlockSize();
    FakeBlockSize(const FakeBlockSize&) = delete;
    FakeBlockSize& operator=(const FakeBlockSize&) = delete;
};

/// While it lives, reading a stream that fdopen() opens fails with EISDIR.
class UnreadableStreams {
public:
    UnreadableStreams();
    ~UnreadableStreams();
    UnreadableStreams(const UnreadableStreams&) = delete;
    UnreadableStreams& operator=(const UnreadableStreams&) = delete;
};

/// While it lives, select() waits for two milliseconds at most and remembers the time asked for.
class ShortSelect {
public:
    ShortSelect();
    ~ShortSelect();
    /// In microseconds, of the last call; -1 before the first one.
    long requested() const;
    ShortSelect(const ShortSelect&) = delete;
    ShortSelect& operator=(const ShortSelect&) = delete;
};

/// While it lives, waitpid() waits for the child that it is asked for and then gives this id.
class FakeWaitedId {
public:
    explicit FakeWaitedId(pid_t pid);
    ~FakeWaitedId();
    FakeWaitedId(const FakeWaitedId&) = delete;
    FakeWaitedId& operator=(const FakeWaitedId&) = delete;
};

#endif
