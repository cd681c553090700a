#ifndef ZRM_HOST_TABLE_SAMPLER_H
#define ZRM_HOST_TABLE_SAMPLER_H

#include "host/api/SampleSource.h"

namespace zrm::host {

/// Takes samples of the agent's registered tables.
class TableSampler : public SampleSource {
public:
    Rows take(std::string_view table, const std::vector<Condition>& conditions) override;
};

} // namespace zrm::host

#endif
