#ifndef ZRM_HOST_SAMPLE_SOURCE_H
#define ZRM_HOST_SAMPLE_SOURCE_H

#include "host/analysis/LogTail.h"
#include "host/framework/Condition.h"

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// The only way in which resources take samples of tables.
class SampleSource {
public:
    /// The rows of one sample.
    struct Rows {
        std::string json; ///< a JSON array of one object per row
        std::size_t count = 0;
        bool truncated = false; ///< as many rows were read as a report may read: there may be more
        Reach reach = {};       ///< of a report

        /// Writes `rows`, `count`, `truncated`, `complete`, `reached` and `reason`, members of an
        /// object.
        void write(JsonWriter& json) const;
    };

    virtual ~SampleSource() = default;

    /// Takes one sample of a table of the agent. May wait for a refresh to end. Any thread.
    virtual Rows take(std::string_view table, const std::vector<Condition>& conditions) = 0;

    /// True when the log that a report's conditions name is monitored now. As `take`.
    virtual bool isMonitored(const std::vector<Condition>& report) = 0;
};

/// Takes samples of the agent's registered tables.
class TableSampler : public SampleSource {
public:
    Rows take(std::string_view table, const std::vector<Condition>& conditions) override;
    bool isMonitored(const std::vector<Condition>& report) override;
};

} // namespace zrm::host

#endif
