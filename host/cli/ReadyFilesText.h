#ifndef ZRM_HOST_READY_FILES_TEXT_H
#define ZRM_HOST_READY_FILES_TEXT_H

#include "host/cli/Commands.h"
#include "host/config/ReadyFiles.h"
#include "host/diagnose/SampleFailure.h"

#include <cstddef>
#include <string>
#include <vector>

namespace zrm::host {

// What `zrmctl formats` and `zrmctl rules` have in common.

/// The outcome of one file's samples.
struct SampleOutcome {
    ReadyFiles::Place place;
    std::size_t samples = 0;
    std::vector<std::string> failures = {}; ///< "PATH:LINE: TEXT"

    void add(const std::vector<SampleFailure>& found);
};

/// Prints what failed and how much did not. `kind` is "formats" or "rules".
CliStatus printOutcomes(Context& context, const std::string& kind,
                        const std::vector<SampleOutcome>& outcomes);

/// Prints a file that has been read.
void printFile(Context& context, const ReadyFiles::Place& place, const std::string& text);

/// The place of a file that is given by its path, with a '/' or the ending ".toml"; no path if it
/// is given by its name.
ReadyFiles::Place placeOfFile(const std::string& name);

} // namespace zrm::host

#endif
