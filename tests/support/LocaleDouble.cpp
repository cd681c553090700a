#include "support/LocaleDouble.h"

#include <algorithm>
#include <atomic>
#include <cstring>
#include <mutex>

namespace {

std::atomic<bool> g_hasLocale{true};
std::atomic<std::uint32_t> g_codePage{LocaleDouble::latin1Page};
std::atomic<int> g_lookups{0};
std::mutex g_mutex;

std::vector<LocaleDouble::Translation>& recorded() {
    static auto* const theTranslations = new std::vector<LocaleDouble::Translation>;
    return *theTranslations;
}

std::string toUTF8(const std::string& latin1) {
    std::string utf8;
    for (const char letter : latin1) {
        const auto code = static_cast<unsigned char>(letter);
        if (code < 0x80) {
            utf8 += letter;
        } else {
            utf8 += static_cast<char>(0xC0 | (code >> 6));
            utf8 += static_cast<char>(0x80 | (code & 0x3F));
        }
    }
    return utf8;
}

std::string fromUTF8(const std::string& utf8) {
    std::string latin1;
    for (std::size_t i = 0; i < utf8.size(); ++i) {
        const auto code = static_cast<unsigned char>(utf8[i]);
        if (code < 0x80 || i + 1 == utf8.size()) {
            latin1 += utf8[i];
        } else {
            const auto low = static_cast<unsigned char>(utf8[++i]);
            latin1 += static_cast<char>(((code & 0x03) << 6) | (low & 0x3F));
        }
    }
    return latin1;
}

} // namespace

void LocaleDouble::setHasLocale(bool hasLocale) {
    g_hasLocale = hasLocale;
}

void LocaleDouble::setCodePage(std::uint32_t codePage) {
    g_codePage = codePage;
}

int LocaleDouble::lookups() {
    return g_lookups;
}

void LocaleDouble::reset() {
    g_hasLocale = true;
    g_codePage = latin1Page;
    const std::lock_guard guard(g_mutex);
    recorded().clear();
}

std::vector<LocaleDouble::Translation> LocaleDouble::translations() {
    const std::lock_guard guard(g_mutex);
    return recorded();
}

// The functions below replace the framework's under their linker names.

extern "C" LOC2_Locale* __wrap__Z14LOC2_GetLocaleiiiPj(int category, int territory, int flags,
                                                       std::uint32_t* status);
extern "C" LOC2_Locale* __wrap__Z14LOC2_GetLocaleiiiPj(int category, int territory, int flags,
                                                       std::uint32_t* status) {
    ++g_lookups;
    *status = 0;
    const bool isAskedAsAgreed = category == 0 && territory == 0 && flags == 0;
    static char locale;
    return g_hasLocale && isAskedAsAgreed ? reinterpret_cast<LOC2_Locale*>(&locale) : nullptr;
}

extern "C" std::uint32_t __wrap__Z21LOC2_GetLocaleNumInfoP11LOC2_LocaleiPj(LOC2_Locale* locale,
                                                                           int item,
                                                                           std::uint32_t* status);
extern "C" std::uint32_t __wrap__Z21LOC2_GetLocaleNumInfoP11LOC2_LocaleiPj(LOC2_Locale* locale,
                                                                           int item,
                                                                           std::uint32_t* status) {
    *status = 0;
    return locale != nullptr && item == LOC2_CODEPAGE ? g_codePage.load() : 0;
}

extern "C" std::int32_t __wrap__Z20LOC2_TranslateStringjPcjjPKcjPjiS2_(
    std::uint32_t targetCodePage, char* target, std::uint32_t targetSize,
    std::uint32_t sourceCodePage, const char* source, std::uint32_t sourceLength,
    std::uint32_t* resultLength, int flags, std::uint32_t* status);
extern "C" std::int32_t __wrap__Z20LOC2_TranslateStringjPcjjPKcjPjiS2_(
    std::uint32_t targetCodePage, char* target, std::uint32_t targetSize,
    std::uint32_t sourceCodePage, const char* source, std::uint32_t sourceLength,
    std::uint32_t* resultLength, int flags, std::uint32_t* status) {
    std::string text(source, sourceLength);
    {
        const std::lock_guard guard(g_mutex);
        recorded().push_back({targetCodePage, targetSize, sourceCodePage, text, flags});
    }
    if (sourceCodePage == LocaleDouble::germanPage) {
        std::replace(text.begin(), text.end(), '{', '\xE4');
    }
    std::string result = targetCodePage == LOC2_UTF8 ? toUTF8(text) : fromUTF8(text);
    const std::size_t terminator = flags == LOC2_NO_TERMINATOR ? 0 : 1;
    result.resize(std::min<std::size_t>(result.size(), targetSize - terminator));
    std::memcpy(target, result.data(), result.size());
    if (terminator == 1) {
        target[result.size()] = '\0';
    }
    *status = 0;
    *resultLength = static_cast<std::uint32_t>(result.size());
    return static_cast<std::int32_t>(result.size());
}
