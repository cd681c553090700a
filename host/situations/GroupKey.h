#ifndef ZRM_HOST_GROUP_KEY_H
#define ZRM_HOST_GROUP_KEY_H

#include "host/events/Episode.h"

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// The values of a group as one text: different groups have different ones.
class GroupKey {
public:
    static constexpr std::size_t longestValue = 256; ///< bytes

    /// Appends a value in UTF-8. Of a longer one the beginning is kept, and a hash of the whole, so
    /// that different values stay different.
    static void append(std::string& key, std::string_view value);

    /// The values of a key, with these names.
    static std::vector<GroupValue> values(std::string_view key,
                                          const std::vector<std::string>& names);

    /// The key of values, in the order of the names; a missing one is empty.
    static std::string of(const std::vector<GroupValue>& values,
                          const std::vector<std::string>& names);
};

} // namespace zrm::host

#endif
