#ifndef ZRM_HOST_MARKED_TEXT_H
#define ZRM_HOST_MARKED_TEXT_H

#include "host/cli/Terminal.h"

#include <cstddef>
#include <string>
#include <string_view>

namespace zrm::host {

/// A text with a caret under one of its places. Stateless.
class MarkedText {
public:
    /// Two lines, each with its end: the text, shown visibly, and the caret under the byte `at`
    /// (behind the text when it is its size), both behind `indent` columns. On a terminal that is
    /// too narrow, the part of the text around the place.
    static std::string of(std::string_view text, std::size_t at, std::size_t indent,
                          const Terminal& terminal);
};

} // namespace zrm::host

#endif
