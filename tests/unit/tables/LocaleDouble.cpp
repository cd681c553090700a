// A locale whose code page is ISO 8859-1, so that a conversion shows against a copy.

#include "framework/locale.h"

#include <cstring>
#include <string>

namespace {
constexpr std::uint32_t latin1 = 819;
char theLocale;
} // namespace

LOC2_Locale* LOC2_GetLocale(int, int, int, std::uint32_t*) {
    return reinterpret_cast<LOC2_Locale*>(&theLocale);
}

std::uint32_t LOC2_GetLocaleNumInfo(LOC2_Locale*, int, std::uint32_t*) {
    return latin1;
}

std::int32_t LOC2_TranslateString(std::uint32_t targetCodePage, char* target,
                                  std::uint32_t targetSize, std::uint32_t /*sourceCodePage*/,
                                  const char* source, std::uint32_t sourceLength,
                                  std::uint32_t* resultLength, int flags, std::uint32_t* status) {
    std::string text;
    for (std::uint32_t i = 0; i < sourceLength; ++i) {
        const auto byte = static_cast<unsigned char>(source[i]);
        if (targetCodePage == latin1 && byte >= 0xC2 && i + 1 < sourceLength) {
            ++i;
            text += static_cast<char>((byte << 6) | (source[i] & 0x3F));
        } else {
            text += source[i];
        }
    }
    const std::size_t room = flags == 0 ? targetSize - 1 : targetSize;
    text.resize(std::min<std::size_t>(text.size(), room));
    std::memcpy(target, text.data(), text.size());
    if (flags == 0) {
        target[text.size()] = '\0';
    }
    *resultLength = static_cast<std::uint32_t>(text.size());
    *status = 0;
    return static_cast<std::int32_t>(text.size());
}
