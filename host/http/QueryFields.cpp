#include "host/http/QueryFields.h"

#include "host/base/TimeText.h"
#include "host/http/RequestRefused.h"

#include <algorithm>
#include <charconv>

namespace zrm::host {

std::vector<std::string> QueryFields::texts(const std::string& name) {
    m_known.push_back(name);
    std::vector<std::string> values;
    const auto [first, last] = m_query.equal_range(name);
    for (auto at = first; at != last; ++at) {
        values.push_back(at->second);
    }
    return values;
}

std::optional<std::string> QueryFields::text(const std::string& name) {
    const std::vector<std::string> values = texts(name);
    if (values.size() > 1) {
        throw RequestRefused(400, "the parameter appears more than once", name);
    }
    return values.empty() ? std::nullopt : std::optional(values.front());
}

std::optional<std::uint64_t> QueryFields::number(const std::string& name, std::uint64_t least,
                                                 std::uint64_t most) {
    const std::optional<std::string> value = text(name);
    if (!value) {
        return std::nullopt;
    }
    std::uint64_t number = 0;
    const char* const end = value->data() + value->size();
    const auto [stop, error] = std::from_chars(value->data(), end, number);
    if (error != std::errc() || stop != end || number < least || number > most) {
        throw RequestRefused(400,
                             "write a whole number from " + std::to_string(least) + " to " +
                                 std::to_string(most),
                             name);
    }
    return number;
}

std::optional<std::int64_t> QueryFields::time(const std::string& name) {
    const std::optional<std::string> value = text(name);
    if (!value) {
        return std::nullopt;
    }
    const std::optional<std::int64_t> time = TimeText::toMilliseconds(*value);
    if (!time) {
        throw RequestRefused(400,
                             "'" + *value +
                                 "' is not a time; write it like 2026-11-20T07:03:09, followed by "
                                 "Z or +01:00 unless it is local",
                             name);
    }
    return time;
}

void QueryFields::refuseUnknown() const {
    std::string known;
    for (const std::string& name : m_known) {
        known += (known.empty() ? "" : ", ") + name;
    }
    for (const auto& [name, value] : m_query) {
        if (std::find(m_known.begin(), m_known.end(), name) == m_known.end()) {
            throw RequestRefused(400,
                                 known.empty() ? "this path takes no parameters"
                                               : "unknown parameter; the parameters are " + known,
                                 name);
        }
    }
}

} // namespace zrm::host
