#ifndef ZRM_HOST_RESULT_H
#define ZRM_HOST_RESULT_H

#include <string>

#include <tl/expected.hpp>

namespace zrm::host {

/// Why something is refused. The texts are clauses: they have no full stop.
struct Problem {
    std::string what;       ///< what is wrong
    std::string cure = {};  ///< how to fix it; empty where `what` leaves nothing to add
    std::string field = {}; ///< the part of the input that is wrong, as in filters[0].op, if any

    /// "WHAT; CURE", for people.
    std::string text() const;

    bool operator==(const Problem&) const = default;
};

/// A value, or the reason why there is none.
template <class T, class E = Problem> using Result = tl::expected<T, E>;

/// What a function returns in place of its Result's value: return refused("is empty", "write it").
tl::unexpected<Problem> refused(std::string what, std::string cure = {}, std::string field = {});

/// "WHAT: the system's text for this errno".
std::string because(const std::string& what, int number);

} // namespace zrm::host

#endif
