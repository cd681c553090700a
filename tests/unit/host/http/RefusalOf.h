#ifndef ZRM_TESTS_REFUSAL_OF_H
#define ZRM_TESTS_REFUSAL_OF_H

#include "host/http/RequestRefused.h"

#include <gtest/gtest.h>

#include <string>

namespace zrm::host {

/// Reads all fields of a request with `read`. Returns the field and the detail of the refusal, or
/// "accepted" without one.
template <typename Fields, typename Request, typename Read>
std::string refusalOf(const Request& request, const Read& read) {
    try {
        Fields fields(request);
        read(fields);
        fields.refuseUnknown();
    } catch (const RequestRefused& refusal) {
        EXPECT_EQ(refusal.refusal().status, 400);
        return refusal.problem().field + ": " + refusal.problem().text();
    }
    return "accepted";
}

} // namespace zrm::host

#endif
