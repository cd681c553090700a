#ifndef ZRM_HOST_RULE_SAMPLES_H
#define ZRM_HOST_RULE_SAMPLES_H

#include "host/diagnose/SampleFailure.h"

#include <vector>

namespace zrm::host {

class ReadyFormats;
struct ReadyRule;

/// Holds ready situations to their samples, by the code that takes entries apart and judges them.
namespace RuleSamples {

/// Empty when the samples meet the conditions and the near misses do not, and there are some of
/// both. Frequencies, groups and logs are not judged: a sample is one entry.
std::vector<SampleFailure> check(const ReadyRule& rule, const ReadyFormats& formats);

} // namespace RuleSamples

} // namespace zrm::host

#endif
