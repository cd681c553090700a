#ifndef ZRM_HOST_MARKED_TEXT_H
#define ZRM_HOST_MARKED_TEXT_H

#include "host/cli/Terminal.h"

#include <cstddef>
#include <string>
#include <string_view>

namespace zrm::host {

/// A text with a caret under one position. Stateless.
class MarkedText {
public:
    /// Two lines, each with its line end: the text in visible form, and the caret under byte `at`
    /// (after the text when `at` is its size), both indented by `indent` columns. On a narrow
    /// terminal, only the part of the text around the position.
    static std::string of(std::string_view text, std::size_t at, std::size_t indent,
                          const Terminal& terminal);
};

} // namespace zrm::host

#endif
