#ifndef ZRM_HOST_READY_FILE_READER_H
#define ZRM_HOST_READY_FILE_READER_H

#include "host/base/Result.h"
#include "host/config/ConfigText.h"
#include "host/config/ReadyFiles.h"

#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

/// Reads a ready file: `read(table, problems, made)` takes its table apart. Refused with every
/// problem, each with the file and the line.
template <class Made, class Read>
Result<Made, std::vector<std::string>> readReadyFile(const ReadyFiles::Place& place, Read&& read) {
    ConfigProblems problems(place.path);
    Made made;
    made.name = place.name;
    made.path = place.path;
    Result<std::string> text = ConfigText::read(place.path, ReadyFiles::largestFile);
    if (!text) {
        problems.add(0, {text.error().what, "make it a readable file of at most 256 KiB"});
    } else {
        made.text = std::move(*text);
        if (const std::optional<toml::table> file = ConfigText::parse(made.text, problems)) {
            read(*file, problems, made);
        }
    }
    if (!problems.none()) {
        return tl::unexpected(problems.texts());
    }
    return made;
}

} // namespace zrm::host

#endif
