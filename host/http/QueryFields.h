#ifndef ZRM_HOST_QUERY_FIELDS_H
#define ZRM_HOST_QUERY_FIELDS_H

#include "host/http/Message.h"

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// Reads the parameters of a request's query. Errors are thrown as RequestRefused, with status 400
/// and the parameter's name as the field.
class QueryFields {
public:
    /// `request` must outlive the object.
    explicit QueryFields(const HttpRequest& request) : m_query(request.query) {}

    /// The value of a parameter that may occur at most once.
    std::optional<std::string> text(const std::string& name);

    /// All values of a parameter.
    std::vector<std::string> texts(const std::string& name);

    /// A whole number within the limits.
    std::optional<std::uint64_t> number(const std::string& name, std::uint64_t least,
                                        std::uint64_t most);

    /// A time: milliseconds since 1970-01-01 UTC.
    std::optional<std::int64_t> time(const std::string& name);

    /// Refuses parameters that have not been read. Call it last.
    void refuseUnknown() const;

private:
    const std::multimap<std::string, std::string>& m_query;
    std::vector<std::string> m_known; ///< names that have been read, in that order
};

} // namespace zrm::host

#endif
