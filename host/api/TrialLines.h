#ifndef ZRM_HOST_TRIAL_LINES_H
#define ZRM_HOST_TRIAL_LINES_H

#include <cstddef>
#include <string>
#include <vector>

namespace zrm::host {

class JsonFields;

/// The lines on which a request tries something. Throws RequestRefused.
namespace TrialLines {

constexpr std::size_t most = 1000;       ///< lines
constexpr std::size_t mostBytes = 16384; ///< of a line

/// Those in the field `lines` of the body.
std::vector<std::string> given(JsonFields& fields);
/// The last lines of a monitored log; the API shows no other files.
std::vector<std::string> ofLog(const JsonFields& fields, const std::string& log, std::size_t count);

} // namespace TrialLines

} // namespace zrm::host

#endif
