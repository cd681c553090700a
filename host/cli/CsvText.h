#ifndef ZRM_HOST_CSV_TEXT_H
#define ZRM_HOST_CSV_TEXT_H

#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Comma-separated values as RFC 4180 has them. Stateless.
class CsvText {
public:
    /// One record with its line end (CR LF): fields with a comma, a quote or a line end stand in
    /// quotes.
    static std::string record(const std::vector<std::string>& fields);
};

} // namespace zrm::host

#endif
