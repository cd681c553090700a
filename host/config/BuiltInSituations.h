#ifndef ZRM_HOST_BUILT_IN_SITUATIONS_H
#define ZRM_HOST_BUILT_IN_SITUATIONS_H

#include <string_view>

namespace zrm::host {

/// The situations that the agent raises itself, for logs with `quiet`. No other has such a name.
namespace BuiltInSituations {

inline constexpr const char* quiet = "log-quiet";
inline constexpr const char* dead = "log-dead";
inline constexpr const char* unparsed = "log-unparsed";

inline bool contain(std::string_view name) {
    return name == quiet || name == dead || name == unparsed;
}

} // namespace BuiltInSituations

} // namespace zrm::host

#endif
