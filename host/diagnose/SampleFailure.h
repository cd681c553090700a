#ifndef ZRM_HOST_SAMPLE_FAILURE_H
#define ZRM_HOST_SAMPLE_FAILURE_H

#include <string>

namespace zrm::host {

/// What is wrong with a sample of a ready file, or with the file.
struct SampleFailure {
    unsigned line = 0; ///< of the sample's entry in the file; 0: the file as a whole
    std::string text;  ///< a clause
};

} // namespace zrm::host

#endif
