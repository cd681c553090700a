#ifndef ZRM_HOST_STATUS_H
#define ZRM_HOST_STATUS_H

namespace zrm::host {

/// The host's own status codes, in addition to those that the tables return. 0 is success
/// everywhere.
namespace Status {

inline constexpr unsigned ok = 0;
inline constexpr unsigned end = 0x21070001;             ///< no further element
inline constexpr unsigned noMemory = 0x21070002;        ///< nothing was stored
inline constexpr unsigned invalidArgument = 0x21070003; ///< the call asks for what does not exist
inline constexpr unsigned notSupported = 0x21070004;    ///< the operation has no meaning here
inline constexpr unsigned truncated = 0x21070005;       ///< the result did not fit and was cut
inline constexpr unsigned noConversion = 0x21070006; ///< no way from the one code page to the other
inline constexpr unsigned duplicate = 0x21070007;    ///< the name is taken

} // namespace Status

} // namespace zrm::host

#endif
