#ifndef ZRM_HOST_FORMAT_SAMPLES_H
#define ZRM_HOST_FORMAT_SAMPLES_H

#include "host/diagnose/SampleFailure.h"

#include <vector>

namespace zrm::host {

struct ReadyFormat;

/// Holds ready formats to their samples, by the code that monitors logs.
namespace FormatSamples {

/// Empty when every sample gives what it must. Also checks that the lines of a sample make one
/// entry, and that another sample behind it begins a new one.
std::vector<SampleFailure> check(const ReadyFormat& ready);

} // namespace FormatSamples

} // namespace zrm::host

#endif
