#include "host/situations/GroupKey.h"

#include "host/base/Utf8.h"

#include <algorithm>
#include <array>
#include <cstdio>

#include <xxhash.h>

namespace zrm::host {

namespace {

constexpr std::size_t lengthBytes = 2; // before each value

void appendLength(std::string& key, std::size_t length) {
    key += static_cast<char>(length >> 8);
    key += static_cast<char>(length & 0xff);
}

std::size_t lengthAt(std::string_view key) {
    return std::size_t{static_cast<unsigned char>(key[0])} << 8 |
           static_cast<unsigned char>(key[1]);
}

} // namespace

void GroupKey::append(std::string& key, std::string_view value) {
    if (value.size() <= longestValue) {
        appendLength(key, value.size());
        key += value;
        return;
    }
    std::array<char, 20> hash{};
    const int length =
        std::snprintf(hash.data(), hash.size(), "~%016llx",
                      static_cast<unsigned long long>(XXH3_64bits(value.data(), value.size())));
    const std::string_view end(hash.data(), static_cast<std::size_t>(length));
    const std::string_view begin = Utf8::prefix(value, longestValue - end.size());
    appendLength(key, begin.size() + end.size());
    key.append(begin).append(end);
}

std::vector<GroupValue> GroupKey::values(std::string_view key,
                                         const std::vector<std::string>& names) {
    std::vector<GroupValue> values;
    for (const std::string& name : names) {
        const std::size_t length =
            key.size() < lengthBytes ? 0 : std::min(lengthAt(key), key.size() - lengthBytes);
        key.remove_prefix(std::min(lengthBytes, key.size()));
        values.push_back({name, std::string(key.substr(0, length))});
        key.remove_prefix(length);
    }
    return values;
}

std::string GroupKey::of(const std::vector<GroupValue>& values,
                         const std::vector<std::string>& names) {
    std::string key;
    for (const std::string& name : names) {
        const auto found = std::find_if(values.begin(), values.end(), [&](const GroupValue& value) {
            return value.name == name;
        });
        append(key, found == values.end() ? std::string_view() : found->value);
    }
    return key;
}

} // namespace zrm::host
