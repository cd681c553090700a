#include "base/ProcessValues.h"
#include "host/diagnose/FormatTrial.h"
#include "require.h"

#include <cstdint>
#include <string>

using namespace zrm;
using namespace zrm::host;

// A format and lines: the first line of an input is the format, each of the others a line. Places
// lie within what they are places of, and what is said of a line holds together.

namespace {

void examine(const FormatTrial::Line& line, const FormatTrial::Result& result) {
    require(!line.matched || !line.failedAt.has_value());
    require(line.matched || !line.reason.empty());
    require(line.matched == !line.row.empty());
    require(!line.failedAt || *line.failedAt <= line.line.size());
    require(!line.directive || *line.directive < result.directives.size());
    for (const FormatTrial::Field& field : line.fields) {
        require(field.from <= field.to && field.to <= line.line.size());
        require(field.directive && *field.directive < result.directives.size());
    }
}

} // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static char systemName[65] = "fuzz:ZRM";
    gSystemName = systemName;
    std::string rest(reinterpret_cast<const char*>(data), size);
    std::vector<std::string> lines;
    while (!rest.empty()) {
        const std::size_t end = rest.find('\n');
        lines.push_back(rest.substr(0, end));
        rest.erase(0, end == std::string::npos ? end : end + 1);
    }
    const std::string format = lines.empty() ? "" : lines.front();
    if (!lines.empty()) {
        lines.erase(lines.begin());
    }
    const FormatTrial::Result result = FormatTrial::run(format, lines);
    require(result.accepted == result.reason.empty());
    require(!result.position || *result.position <= format.size());
    for (const FormatTrial::Directive& directive : result.directives) {
        require(directive.from < directive.to && directive.to <= format.size());
    }
    for (const FormatTrial::Line& line : result.lines) {
        examine(line, result);
    }
    FormatTrial::json(result);
    return 0;
}
