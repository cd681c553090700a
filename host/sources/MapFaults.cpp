#include "host/sources/MapFaults.h"

#include <csignal>

#include <sys/mman.h>
#include <unistd.h>

namespace zrm::host {

namespace {

// Read and written by the thread itself, also in its signal handler.
constinit thread_local volatile sig_atomic_t depth = 0;
constinit thread_local volatile std::uint64_t faults = 0;

std::uintptr_t pageSize = 4096;

/// Puts a page of zeros in place of the one that cannot be read. All of it may be called in a
/// signal handler.
void replacePage(int number, siginfo_t* info, void* /*context*/) {
    if (depth > 0 && info->si_code > 0) {
        const auto address = reinterpret_cast<std::uintptr_t>(info->si_addr);
        void* const page = reinterpret_cast<void*>(address - address % pageSize);
        if (mmap(page, pageSize, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_FIXED,
                 -1, 0) == page) {
            faults = faults + 1;
            return;
        }
    }
    // The access is repeated, and ends the process.
    signal(number, SIG_DFL);
}

bool install() {
    pageSize = static_cast<std::uintptr_t>(sysconf(_SC_PAGESIZE));
    struct sigaction action {};
    action.sa_sigaction = replacePage;
    action.sa_flags = SA_SIGINFO;
    sigemptyset(&action.sa_mask);
    return sigaction(SIGBUS, &action, nullptr) == 0;
}

/// A blocked fault would end the process.
bool unblock() {
    sigset_t bus;
    sigemptyset(&bus);
    sigaddset(&bus, SIGBUS);
    return pthread_sigmask(SIG_UNBLOCK, &bus, nullptr) == 0;
}

} // namespace

MapFaults::MapFaults() noexcept {
    static const bool isInstalled = install();
    static thread_local const bool isUnblocked = unblock();
    static_cast<void>(isInstalled && isUnblocked);
    depth = depth + 1;
}

MapFaults::~MapFaults() {
    depth = depth - 1;
}

std::uint64_t MapFaults::count() noexcept {
    return faults;
}

} // namespace zrm::host
