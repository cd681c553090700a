#ifndef ZRM_TESTS_LOCALE_DOUBLE_H
#define ZRM_TESTS_LOCALE_DOUBLE_H

#include "framework/locale.h"

#include <cstdint>
#include <string>
#include <vector>

/// Stands in for the framework's locale services (linked with --wrap): a locale whose code page is
/// ISO-8859-1 (819) unless a test says otherwise. Translation between 819 and 1208 is real, and so
/// is that of one character of 1011.
namespace LocaleDouble {

inline constexpr std::uint32_t latin1Page = 819;
/// ISO 646 as Germany had it: 0x7B is not a brace but an umlaut.
inline constexpr std::uint32_t germanPage = 1011;

/// One call of LOC2_TranslateString.
struct Translation {
    std::uint32_t targetCodePage;
    std::uint32_t targetSize;
    std::uint32_t sourceCodePage;
    std::string source;
    int flags;
};

/// False: LOC2_GetLocale gives null.
void setHasLocale(bool hasLocale);
/// The locale's code page; 0: none.
void setCodePage(std::uint32_t codePage);
/// Number of calls of LOC2_GetLocale so far.
int lookups();
/// Forgets the translations, and puts the defaults back.
void reset();
std::vector<Translation> translations();

} // namespace LocaleDouble

#endif
