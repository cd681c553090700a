#include "base/UTF8Conv.h"

#include "base/TraceScope.h"
#include "framework/locale.h"

#include <atomic>

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
