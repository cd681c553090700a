#ifndef ZRM_HOST_EVENT_EXTRAS_H
#define ZRM_HOST_EVENT_EXTRAS_H

#include "host/base/Result.h"

#include <cstddef>
#include <map>
#include <string>

namespace zrm::host {

/// What a situation adds to each of its events for the receivers: a link and labels. Stateless.
namespace EventExtras {

using Labels = std::map<std::string, std::string>;

inline constexpr std::size_t longestRunbook = 2048; ///< bytes
inline constexpr std::size_t mostLabels = 32;
inline constexpr std::size_t longestLabelName = 64;   ///< bytes
inline constexpr std::size_t longestLabelValue = 256; ///< bytes

/// Whether a text is the URL of a page for people: http or https, maybe with a fragment.
Result<void> checkRunbook(const std::string& url);

/// Whether labels have names and values that every receiver takes.
Result<void> checkLabels(const Labels& labels);

} // namespace EventExtras

} // namespace zrm::host

#endif
