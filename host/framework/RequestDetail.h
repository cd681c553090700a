#ifndef ZRM_HOST_REQUEST_DETAIL_H
#define ZRM_HOST_REQUEST_DETAIL_H

#include "framework/ctreq.h"
#include "host/framework/Condition.h"

#include <string>
#include <vector>

/// What a request asks for: its name, kind and conditions. Built by the opener of a request and
/// kept alive until the request is destroyed; immutable meanwhile.
class RequestDetail {
public:
    std::string name; ///< the situation's name, or the report's label
    SampleType sampleType = SAMPLE_SITUATION;
    unsigned interval = 0;                        ///< sampling interval, seconds; 0: event-driven
    std::vector<zrm::host::Condition> conditions; ///< all must hold
};

#endif
