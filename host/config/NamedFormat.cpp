#include "host/config/NamedFormat.h"

#include "host/config/FormatReader.h"
#include "host/config/ReadyFormats.h"

#include <iterator>
#include <string>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::size_t mostNames = 64;

/// Adds a further format to the first. Records a problem if they cannot be one.
void join(ConfigSection& section, const ConfigSection::Text& name, FormatDescription&& further,
          FormatDescription& format) {
    if (format.type != "syslog" || further.type != "syslog") {
        section.problem(name.second, "format",
                        "'" + name.first + "' cannot be joined with the others",
                        "name one format, or several of type \"syslog\"");
        return;
    }
    format.extracts.insert(format.extracts.end(), std::make_move_iterator(further.extracts.begin()),
                           std::make_move_iterator(further.extracts.end()));
}

} // namespace

std::optional<FormatDescription> readNamedFormat(ConfigSection& section,
                                                 const ReadyFormats& formats) {
    const auto names = section.texts("format");
    if (!names) {
        return std::nullopt;
    }
    if (names->empty() || names->size() > mostNames) {
        section.problem("format", "names " + std::to_string(names->size()) + " formats",
                        "write 1 to 64 names");
        return std::nullopt;
    }
    const std::size_t problems = section.problemCount();
    std::optional<FormatDescription> format;
    for (const ConfigSection::Text& name : *names) {
        Result<ReadyFormat> ready = formats.find(name.first);
        if (!ready) {
            section.problem(name.second, "format", ready.error().what, ready.error().cure);
        } else if (!format) {
            format = std::move(ready->format);
        } else {
            join(section, name, std::move(ready->format), *format);
        }
    }
    if (section.problemCount() != problems) {
        FormatReader::passOver(section);
        return std::nullopt;
    }
    return FormatReader::readOver(section, std::move(*format));
}

} // namespace zrm::host
