#ifndef ZRM_HOST_LINE_HEADS_H
#define ZRM_HOST_LINE_HEADS_H

#include "host/diagnose/LineTokens.h"

#include <cstddef>
#include <string>
#include <vector>

namespace zrm::host {

/// Lines whose columns in front of the message are the same.
struct LineHead {
    std::vector<const std::vector<LineToken>*> lines; ///< never empty; whole, with their messages
    std::size_t all = 0;                              ///< lines of all heads together
    std::size_t length = 0;                           ///< tokens in front of the message
    std::size_t certain = 0; ///< of these, those up to the time and the level
};

/// Sorts lines by their columns. The heads point to the lines. Lines without a time and a level are
/// in none.
std::vector<LineHead> lineHeads(const std::vector<std::vector<LineToken>>& lines);

} // namespace zrm::host

#endif
