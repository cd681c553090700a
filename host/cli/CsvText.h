#ifndef ZRM_HOST_CSV_TEXT_H
#define ZRM_HOST_CSV_TEXT_H

#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Comma-separated values in the form of RFC 4180. Stateless.
class CsvText {
public:
    /// One record with its line end (CR LF). Fields with a comma, a quote or a line end are quoted.
    static std::string record(const std::vector<std::string>& fields);
};

} // namespace zrm::host

#endif
