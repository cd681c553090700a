#include "base/UTF8Conv.h"

#include "base/Ascii.h"
#include "base/RowBytes.h"
#include "base/TraceScope.h"
#include "framework/locale.h"

#include <atomic>
#include <cstring>
#include <iterator>
#include <numeric>

namespace zrm {

namespace {

TRC1_Anchor anchor{"UTF8Conv.cpp"};

/// Caches the locale after the first look-up. A race on the first call only repeats the look-up.
struct LocaleCache {
    std::atomic<LOC2_Locale*> locale{nullptr};
    std::atomic<bool> isKnown{false};

    [[gnu::always_inline]] LOC2_Locale* get() {
        if (!isKnown.load(std::memory_order_acquire)) [[unlikely]] {
            lookUp();
        }
        return locale.load(std::memory_order_relaxed);
    }
    [[gnu::noinline]] void lookUp() {
        std::uint32_t status = 0;
        locale.store(LOC2_GetLocale(0, 0, 0, &status), std::memory_order_relaxed);
        isKnown.store(true, std::memory_order_release);
    }
};

// Each direction looks up the locale separately.
LocaleCache toUTF8Locale;
LocaleCache fromUTF8Locale;

/// The locale's code page, or 0 if there is none, which is traced whatever the trace level. Called
/// twice per line of a log.
[[gnu::always_inline]] inline std::uint32_t
localCodePage(const TraceScope& trace, LocaleCache& cache, const char* noCodePage) {
    LOC2_Locale* const locale = cache.get();
    if (locale == nullptr) {
        trace.always()("Locale returned null; no locale found.");
        return 0;
    }
    std::uint32_t status = 0;
    const std::uint32_t codePage = LOC2_GetLocaleNumInfo(locale, LOC2_CODEPAGE, &status);
    if (codePage == 0) {
        trace.always()("%s", noCodePage);
    }
    return codePage;
}

inline std::int32_t translate(const TraceScope& trace, std::uint32_t targetCodePage, char* out,
                              std::size_t outSize, std::uint32_t sourceCodePage, const char* in,
                              std::size_t inLength, int flags) {
    std::uint32_t resultLength = 0;
    std::uint32_t status = 0;
    const std::int32_t bytesCopied = LOC2_TranslateString(
        targetCodePage, out, static_cast<std::uint32_t>(outSize), sourceCodePage, in,
        static_cast<std::uint32_t>(inLength), &resultLength, flags, &status);
    if (trace.isOn(TRC1_DETAIL)) { // twice per line of a log
        trace.detail()("bytesCopied = %d", bytesCopied);
    }
    return bytesCopied;
}

/// Whether the local code page has ASCII as UTF-8 does.
bool sharesAscii(std::uint32_t codePage) {
    char ascii[128];
    std::iota(std::begin(ascii), std::end(ascii), '\0');
    char converted[sizeof ascii];
    std::uint32_t length = 0;
    std::uint32_t status = 0;
    return LOC2_TranslateString(LOC2_UTF8, converted, sizeof converted, codePage, ascii,
                                sizeof ascii, &length, LOC2_NO_TERMINATOR,
                                &status) == sizeof ascii &&
           std::memcmp(converted, ascii, sizeof ascii) == 0;
}

/// Whether ASCII is copied: in the lowest bit, and above it the generation of trace levels for
/// which that is so.
constinit std::atomic<std::uint64_t> asciiIsCopied{0};

/// Not while levels differ between threads, because then no anchor stores one.
[[gnu::noinline]] bool findAsciiIsCopied() {
    TRC1_Sync(anchor);
    const unsigned generation = anchor.generation.load(std::memory_order_acquire);
    if (generation != TRC1_Generation.load(std::memory_order_relaxed)) {
        return false;
    }
    const bool isTraced = (anchor.level.load(std::memory_order_relaxed) & TRC1_DETAIL) != 0;
    LOC2_Locale* const locale = toUTF8Locale.get();
    std::uint32_t status = 0;
    const std::uint32_t codePage =
        locale == nullptr ? 0 : LOC2_GetLocaleNumInfo(locale, LOC2_CODEPAGE, &status);
    const bool isCopied = !isTraced && codePage != 0 && sharesAscii(codePage);
    asciiIsCopied.store(std::uint64_t{generation} << 1 | (isCopied ? 1U : 0U),
                        std::memory_order_relaxed);
    return isCopied;
}

/// Once per line of a log.
[[gnu::always_inline]] inline bool isAsciiCopied() {
    const std::uint64_t known = asciiIsCopied.load(std::memory_order_relaxed);
    return known >> 1 == TRC1_Generation.load(std::memory_order_relaxed) ? (known & 1) != 0
                                                                         : findAsciiIsCopied();
}

} // namespace

std::int32_t UTF8Conv::Convert_toUTF8(char* out, std::size_t outSize, const char* in,
                                      std::size_t inLength, int flags) {
    TraceScope trace(anchor);
    const std::uint32_t codePage =
        localCodePage(trace, toUTF8Locale, "Codepage returned was 0; not a valid codepage.");
    if (codePage == 0) {
        return trace.result(0);
    }
    return trace.result(translate(trace, LOC2_UTF8, out, outSize, codePage, in, inLength, flags));
}

std::int32_t UTF8Conv::columnToUTF8(char* out, std::size_t outSize, std::string_view in) {
    if (isAsciiCopied() && in.size() <= outSize && isAscii(in)) {
        RowBytes::copy(out, in.data(), in.size());
        return static_cast<std::int32_t>(in.size());
    }
    return Convert_toUTF8(out, outSize, in.data(), in.size(), LOC2_NO_TERMINATOR);
}

std::int32_t UTF8Conv::Convert_fromUTF8(char* out, std::size_t outSize, const char* in,
                                        std::size_t inLength) {
    TraceScope trace(anchor);
    trace.detail()("Convert_from UTF8 reslen=%d srclen=%d", static_cast<int>(outSize),
                   static_cast<int>(inLength));
    const std::uint32_t codePage =
        localCodePage(trace, fromUTF8Locale, "Codepage return was 0; Not a valid codepage.");
    if (codePage == 0) {
        return trace.result(0);
    }
    return trace.result(translate(trace, codePage, out, outSize, LOC2_UTF8, in, inLength, 0));
}

} // namespace zrm
