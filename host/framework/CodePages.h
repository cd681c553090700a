#ifndef ZRM_HOST_CODE_PAGES_H
#define ZRM_HOST_CODE_PAGES_H

#include "framework/locale.h"

#include <cstdint>
#include <string_view>

inline constexpr std::uint32_t LOC2_ASCII = 367; ///< code page number of ASCII

/// One code set that the host knows by number; the agent uses it as a locale. Every code set here
/// has ASCII as its first 128 codes and no shift state. Immutable and static.
struct LOC2_Locale {
    std::string_view codeSet; ///< as returned by nl_langinfo(CODESET); also known to iconv
    std::uint32_t codePage;   ///< 0: a code set without a number
    bool singleByte;          ///< every character is a single byte
};

namespace zrm::host {

/// The code sets and their code page numbers.
namespace CodePages {

/// The code set of this name, ignoring case, hyphens and underscores; the one without a number when
/// the name is unknown. Never null.
const LOC2_Locale* byName(std::string_view codeSet) noexcept;

/// The first code set with this number; null when there is none.
const LOC2_Locale* byNumber(std::uint32_t codePage) noexcept;

/// Whether byNumber finds one; fast for the code sets of nearly all systems.
inline bool isKnown(std::uint32_t codePage) noexcept {
    return codePage == LOC2_UTF8 || codePage == LOC2_ASCII || byNumber(codePage) != nullptr;
}

} // namespace CodePages

} // namespace zrm::host

#endif
