#ifndef ZRM_HOST_SAMPLE_REQUEST_H
#define ZRM_HOST_SAMPLE_REQUEST_H

#include "host/framework/Condition.h"
#include "host/http/Problem.h"

#include <string_view>
#include <variant>
#include <vector>

namespace zrm::host {

/// Reads the body of a sample request. Stateless.
class SampleRequest {
public:
    /// The conditions of {"filters": [{"column": .., "op": .., "value": ..}, ..]} on a table's
    /// columns, or what is wrong with the body. A report on Log Entries must name its log and both
    /// ends of its time window.
    static std::variant<std::vector<Condition>, Problem> parse(std::string_view table,
                                                               std::string_view body);
};

} // namespace zrm::host

#endif
