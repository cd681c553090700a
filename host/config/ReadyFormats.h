#ifndef ZRM_HOST_READY_FORMATS_H
#define ZRM_HOST_READY_FORMATS_H

#include "host/base/Result.h"
#include "host/config/ReadyFiles.h"
#include "host/formats/FormatDescription.h"

#include <map>
#include <string>
#include <vector>

namespace zrm::host {

/// A file that describes the entries of a program's logs, NAME.toml in a directory of formats.
struct ReadyFormat {
    /// An entry, and what the format must make of it.
    struct Sample {
        std::string entry;
        std::string time; ///< as the entry has it, in ISO 8601; "--MM-DDThh:mm:ss" without a year
        std::map<std::string, std::string> columns; ///< those that are not named must be empty
        std::map<std::string, std::string> fields;  ///< those that are named must be so
        bool isRejected = false;                    ///< the entry must not fit
        unsigned line = 0;                          ///< in the file
    };

    std::string name;
    std::string path;
    std::string about;      ///< one line for people
    bool isGeneric = false; ///< of many programs: suggested only if none of one program is as good
    std::string text;       ///< the file's
    FormatDescription format;
    std::vector<Sample> samples;
};

/// Finds the ready formats of some directories. Any thread; reads the files anew at each call.
class ReadyFormats {
public:
    using Place = ReadyFiles::Place;

    /// A name is looked for in these directories first, then in the usual ones.
    explicit ReadyFormats(std::vector<std::string> directories);

    /// Reads the format with this name. The problem names the file where one is at fault.
    Result<ReadyFormat> find(const std::string& name) const;
    /// All formats in the order of their names. Of several with one name, the one that counts.
    std::vector<Place> list() const;

    /// Reads a file. What is wrong with it, as ConfigProblems::texts.
    static Result<ReadyFormat, std::vector<std::string>> load(const Place& place);

private:
    ReadyFiles m_files;
};

} // namespace zrm::host

#endif
