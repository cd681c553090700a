#ifndef ZRM_HOST_FORMAT_SAMPLES_H
#define ZRM_HOST_FORMAT_SAMPLES_H

#include <cstddef>
#include <string>
#include <vector>

namespace zrm::host {

struct ReadyFormat;

/// Holds ready formats to their samples, by the code that monitors logs.
namespace FormatSamples {

/// What is wrong with a sample, or with the format.
struct Failure {
    unsigned line = 0; ///< of the sample's entry in the file; 0: the format as a whole
    std::string text;  ///< a clause
};

/// Empty when every sample gives what it must. Also checks that the lines of a sample make one
/// entry, and that another sample behind it begins a new one.
std::vector<Failure> check(const ReadyFormat& ready);

} // namespace FormatSamples

} // namespace zrm::host

#endif
