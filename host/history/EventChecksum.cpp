#include "host/history/EventChecksum.h"

#include <xxhash.h>

namespace zrm::host {

std::int64_t eventChecksum(std::int64_t id, std::int64_t raised, std::int64_t label,
                           std::string_view json) noexcept {
    // Odd multipliers: different values of one number always give different seeds, on any machine.
    const std::uint64_t seed = static_cast<std::uint64_t>(id) * 0x9e3779b97f4a7c15 +
                               static_cast<std::uint64_t>(raised) * 0xc2b2ae3d27d4eb4f +
                               static_cast<std::uint64_t>(label) * 0x165667b19e3779f9;
    return static_cast<std::int64_t>(XXH3_64bits_withSeed(json.data(), json.size(), seed));
}

} // namespace zrm::host
