#ifndef ZRM_HOST_FORMAT_DESCRIPTION_H
#define ZRM_HOST_FORMAT_DESCRIPTION_H

#include "host/base/Result.h"
#include "logs/EntryFormat.h"
#include "logs/LineJoin.h"

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// Which lines make one entry, as the key `entry` of a [[log]] table or a ready format says it.
struct EntryLines {
    std::string starts;    ///< RE2: a line that matches begins an entry; empty: not given
    std::string continues; ///< RE2: a line that matches belongs to the entry before it
    bool indented = false; ///< a line that begins with a blank or a tab does
    LineJoin::Limits limits;

    bool isGiven() const noexcept { return !starts.empty() || !continues.empty() || indented; }
};

/// What a [[log]] table or a ready format says about the entries of a log. The names of columns are
/// time, system, source, type, class and description.
struct FormatDescription {
    /// Fields that are read from the descriptions of some of the entries.
    struct Extract {
        std::string source; ///< glob of ENTRYSRC without "[process]"; empty: all
        std::vector<std::string>
            patterns; ///< RE2 with named captures; the first that matches counts
    };

    std::string type; ///< "regex", "json", "logfmt", "syslog" or "wtmp"; empty: the table says none
    /// type "regex": RE2 with named captures, tried in this order.
    std::vector<std::string> patterns;
    std::string timeFormat;                      ///< see TimePattern; empty: "auto"
    std::map<std::string, std::string> columns;  ///< types "json", "logfmt": column to field
    std::map<std::string, std::string> defaults; ///< column to its text where the entry has none
    /// For each column, the texts of the log and what the column shows in their place.
    std::map<std::string, std::map<std::string, std::string>> values;
    std::string unwrap; ///< "docker" or "cri"; empty: entries are the lines themselves
    std::vector<Extract> extracts;
    bool pairs = false; ///< pairs such as port=8080 in the description are fields
    EntryLines lines;

    /// All that decides what is read from an entry, as a text: EntryFormat::definition.
    std::string definition() const;
};

/// The types for which makeFormat has formats.
std::vector<const char*> formatTypes();

/// The format; a problem names the part of the description that is wrong in Problem::field, as in
/// "format" or "columns.time".
Result<std::shared_ptr<const EntryFormat>> makeFormat(const FormatDescription& description);

/// How lines are joined to entries; null if each line is an entry.
Result<std::shared_ptr<const LineJoin>> makeLineJoin(const FormatDescription& description);

} // namespace zrm::host

#endif
