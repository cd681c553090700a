#ifndef ZRM_TESTS_FAKE_RESOLVER_H
#define ZRM_TESTS_FAKE_RESOLVER_H

#include <string>

/// While it lives, every name but those that are digits belongs to the host of `address`, and who
/// looks one up waits until answer() is called. One at a time.
class FakeResolver {
public:
    explicit FakeResolver(const std::string& address);
    ~FakeResolver(); ///< answers, and waits until nobody waits any more
    FakeResolver(const FakeResolver&) = delete;
    FakeResolver& operator=(const FakeResolver&) = delete;

    void answer();

    /// Number of lookups so far.
    int lookups() const;
};

#endif
