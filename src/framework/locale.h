#ifndef ZRM_FRAMEWORK_LOCALE_H
#define ZRM_FRAMEWORK_LOCALE_H

#include <cstdint>

/// A locale of the framework's national-language service; opaque to the agent.
struct LOC2_Locale;

inline constexpr std::uint32_t LOC2_UTF8 = 1208; ///< code page number of UTF-8
inline constexpr int LOC2_CODEPAGE = 9;          ///< information item: the locale's code page
inline constexpr int LOC2_NO_TERMINATOR = 256;   ///< flag: the target is a fixed-width column

/// Returns the process's current locale, or null. The framework owns it. Any thread.
LOC2_Locale* LOC2_GetLocale(int category, int territory, int flags, std::uint32_t* status);

/// Returns a numeric information item of the locale, or 0 if the locale has none. Any thread.
std::uint32_t LOC2_GetLocaleNumInfo(LOC2_Locale* locale, int item, std::uint32_t* status);

/// Converts `sourceLength` bytes between code pages and returns the number of bytes written, not
/// counting a terminator. With flags 0 the text is terminated within `targetSize`; with
/// LOC2_NO_TERMINATOR nothing is written after the text. Bytes that are invalid in the source code
/// page become its substitution character. If the target is full, the text ends at a character
/// boundary. Any thread; takes no lock.
std::int32_t LOC2_TranslateString(std::uint32_t targetCodePage, char* target,
                                  std::uint32_t targetSize, std::uint32_t sourceCodePage,
                                  const char* source, std::uint32_t sourceLength,
                                  std::uint32_t* resultLength, int flags, std::uint32_t* status);

#endif
