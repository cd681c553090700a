#include "host/config/NamedTextFormat.h"

#include "host/framework/TraceCapture.h"
#include "logtypes/UserLogFile.h"
#include "parser/BuildArea.h"
#include "parser/StringParser.h"

#include <string_view>

namespace zrm::host {

namespace {

constexpr std::string_view nameToken = "${@}";

} // namespace

Result<void> checkNamedTextFormat(const std::string& format, const std::string& path) {
    std::string named = format;
    for (std::size_t at = named.find(nameToken); at != named.npos;
         at = named.find(nameToken, at + path.size())) {
        named.replace(at, nameToken.size(), path);
    }
    if (named == format) {
        return {};
    }
    const std::string replaced = " once each ${@} is replaced by '" + path + "'";
    if (named.size() > longestTextFormat) {
        return refused("has " + std::to_string(named.size()) + " characters" + replaced,
                       "write at most " + std::to_string(longestTextFormat) +
                           ", with ${@} in fewer places");
    }
    const TraceSilence silence;
    if (StringParser(named.c_str(), UserLogFile::followedFields()).status() ==
        OBJECT_FORMAT_LEARNED) {
        return {};
    }
    if (path.find_first_of("%\"") != path.npos) {
        return refused("cannot be used" + replaced + ", since '%' and '\"' mean something in it",
                       "leave out ${@}, or give the log another path");
    }
    return refused("has a directive of more than " + std::to_string(_BuildArea::limit) +
                       " characters" + replaced,
                   "write ${@} in fewer places, or give the log a shorter path");
}

} // namespace zrm::host
