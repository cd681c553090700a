#ifndef ZRM_ASCII_H
#define ZRM_ASCII_H

#include <string_view>

namespace zrm {

/// Whether all of the text is ASCII. Looks at every byte, so it is for short texts that mostly are.
bool isAscii(std::string_view text) noexcept;

} // namespace zrm

#endif
