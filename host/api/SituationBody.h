#ifndef ZRM_HOST_SITUATION_BODY_H
#define ZRM_HOST_SITUATION_BODY_H

#include "host/config/SituationValidator.h"

#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

class JsonFields;

/// Reads situations out of the bodies of requests. What is wrong is thrown as RequestRefused.
/// Stateless.
class SituationBody {
public:
    /// The fields of an object, which may have no others. Where it has no name, it gets this one.
    static SituationText text(JsonFields& fields, const std::string& name = "");

    /// The situation of an object; the first thing that is wrong with it is the one refused.
    static SituationConfig situation(JsonFields& fields, const std::string& name = "");
};

} // namespace zrm::host

#endif
