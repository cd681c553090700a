#include "host/formats/FormatDescription.h"
#include "host/formats/JsonFormat.h"
#include "host/formats/LogfmtFormat.h"
#include "host/formats/PairedFormat.h"
#include "host/formats/RegexFormat.h"
#include "host/formats/SyslogFormat.h"
#include "host/formats/UnwrappedFormat.h"
#include "host/formats/WtmpFormat.h"

#include <algorithm>
#include <iterator>
#include <utility>

namespace zrm::host {

namespace {

/// A kind of format.
struct Kind {
    const char* type;
    Result<std::shared_ptr<const EntryFormat>> (*make)(const FormatDescription& description);
};

constexpr Kind kinds[] = {
    {"json", &JsonFormat::make},     {"logfmt", &LogfmtFormat::make}, {"regex", &RegexFormat::make},
    {"syslog", &SyslogFormat::make}, {"wtmp", &WtmpFormat::make},
};

/// The format of what the lines hold, whatever is around it.
Result<std::shared_ptr<const EntryFormat>> makeInner(const FormatDescription& description) {
    const auto kind = std::find_if(std::begin(kinds), std::end(kinds),
                                   [&](const Kind& one) { return description.type == one.type; });
    if (kind == std::end(kinds)) {
        return refused("'" + description.type + "' is not a kind of format", "write another type",
                       "type");
    }
    auto format = kind->make(description);
    if (format && description.pairs) {
        return std::make_shared<const PairedFormat>(std::move(*format));
    }
    return format;
}

} // namespace

std::vector<const char*> formatTypes() {
    std::vector<const char*> types;
    for (const Kind& kind : kinds) {
        types.push_back(kind.type);
    }
    return types;
}

Result<std::shared_ptr<const EntryFormat>> makeFormat(const FormatDescription& description) {
    return description.unwrap.empty() ? makeInner(description)
                                      : UnwrappedFormat::make(description, &makeInner);
}

} // namespace zrm::host
