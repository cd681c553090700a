#include "support/FakeResolver.h"

#include <atomic>

#include <netdb.h>
#include <unistd.h>

namespace {

std::atomic<bool> g_isActive{false};
std::atomic<bool> g_answers{false};
std::atomic<int> g_lookups{0};
std::atomic<int> g_waiting{0};
std::string g_address;

constexpr useconds_t slice = 1000;

} // namespace

FakeResolver::FakeResolver(const std::string& address) {
    g_address = address;
    g_answers = false;
    g_lookups = 0;
    g_isActive = true;
}

FakeResolver::~FakeResolver() {
    g_isActive = false;
    answer();
    while (g_waiting > 0) {
        usleep(slice);
    }
}

void FakeResolver::answer() {
    g_answers = true;
}

int FakeResolver::lookups() const {
    return g_lookups;
}

extern "C" int __real_getaddrinfo(const char* node, const char* service, const addrinfo* hints,
                                  addrinfo** found);
extern "C" int __wrap_getaddrinfo(const char* node, const char* service, const addrinfo* hints,
                                  addrinfo** found);
extern "C" int __wrap_getaddrinfo(const char* node, const char* service, const addrinfo* hints,
                                  addrinfo** found) {
    const bool isDigits = hints != nullptr && (hints->ai_flags & AI_NUMERICHOST) != 0;
    if (!g_isActive || isDigits) {
        return __real_getaddrinfo(node, service, hints, found);
    }
    ++g_waiting;
    ++g_lookups;
    while (!g_answers) {
        usleep(slice);
    }
    const int result = __real_getaddrinfo(g_address.c_str(), service, hints, found);
    --g_waiting;
    return result;
}
