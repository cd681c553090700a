#include "host/framework/IconvCache.h"

#include "host/framework/CancellationOff.h"

namespace zrm::host {

namespace {

// A process converts between UTF-8 and its own code set, in both directions.
constexpr unsigned entries = 4;

struct Entry {
    std::uint32_t to;
    std::uint32_t from;
    iconv_t converter;
};

thread_local Entry t_entries[entries];
thread_local unsigned t_used = 0;
thread_local unsigned t_oldest = 0;

/// Closes the thread's converters when it ends. The entries themselves have no destructor, so they
/// can be used afterwards.
struct Closer {
    ~Closer() {
        while (t_used > 0) {
            iconv_close(t_entries[--t_used].converter);
        }
        t_oldest = 0;
    }
    /// The first call in a thread registers the destructor to run when the thread ends.
    void arm() noexcept {}
};

thread_local Closer t_closer;

Entry& entryToFill() noexcept {
    if (t_used < entries) {
        return t_entries[t_used++];
    }
    Entry& oldest = t_entries[t_oldest];
    t_oldest = (t_oldest + 1) % entries;
    iconv_close(oldest.converter);
    return oldest;
}

} // namespace

iconv_t IconvCache::find(const LOC2_Locale& to, const LOC2_Locale& from) noexcept {
    for (unsigned index = 0; index < t_used; ++index) {
        const Entry& entry = t_entries[index];
        if (entry.to == to.codePage && entry.from == from.codePage) {
            iconv(entry.converter, nullptr, nullptr, nullptr, nullptr);
            return entry.converter;
        }
    }
    // iconv_open may read files.
    const CancellationOff guard;
    const iconv_t converter = iconv_open(to.codeSet.data(), from.codeSet.data());
    if (converter != none()) {
        t_closer.arm();
        entryToFill() = {to.codePage, from.codePage, converter};
    }
    return converter;
}

} // namespace zrm::host
