#ifndef ZRM_HOST_SITUATION_LABEL_H
#define ZRM_HOST_SITUATION_LABEL_H

#include <string>

namespace zrm::host {

/// What a situation adds to its events. Immutable; shared by the situation and its undelivered
/// events.
struct SituationLabel {
    std::string name;
    std::string severity;  ///< info, minor, warning, major or critical
    std::string text = {}; ///< its description for people; may be empty
};

} // namespace zrm::host

#endif
