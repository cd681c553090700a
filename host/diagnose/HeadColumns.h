#ifndef ZRM_HOST_HEAD_COLUMNS_H
#define ZRM_HOST_HEAD_COLUMNS_H

#include "host/diagnose/LineHeads.h"

#include <cstddef>
#include <map>
#include <string>

namespace zrm::host {

/// What the columns in front of the messages of some lines are, as a regular expression.
struct HeadColumns {
    std::string pattern;    ///< with captures
    std::string start;      ///< for the lines that begin an entry; empty: they do not show it
    std::size_t length = 0; ///< tokens in front of the message
    bool hasType = false;
    /// Letters that stand for levels: FormatDescription::values.
    std::map<std::string, std::map<std::string, std::string>> values;

    /// `length`: tokens of the head that may be columns.
    static HeadColumns of(const LineHead& head, std::size_t length);
};

} // namespace zrm::host

#endif
