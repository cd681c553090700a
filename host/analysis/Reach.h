#ifndef ZRM_HOST_REACH_H
#define ZRM_HOST_REACH_H

#include <nlohmann/json_fwd.hpp>

#include <string>

namespace zrm::host {

/// How far back logs were read and why reading stopped.
struct Reach {
    std::string reached; ///< ENTRYTIME of the oldest entry read; empty: none was read
    std::string reason;  ///< why reading stopped early, as a clause; empty: everything was read

    bool isComplete() const noexcept { return reason.empty(); }
    /// Adds `complete`, `reached` and `reason` to a JSON object.
    void addTo(nlohmann::ordered_json& object) const;
};

} // namespace zrm::host

#endif
