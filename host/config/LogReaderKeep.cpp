// The part of LogReader for what events have of their entries beside the rows.

#include "base/EntryFields.h"
#include "host/config/LogReader.h"
#include "logtypes/FormatLogFile.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

std::vector<std::string> LogReader::namesOfFields(ConfigSection& section,
                                                  const std::vector<ConfigSection::Text>& names) {
    std::vector<std::string> fields;
    if (names.size() > EntryFields::most) {
        section.problem("keep", "has " + std::to_string(names.size()) + " items",
                        "write at most " + std::to_string(EntryFields::most) +
                            ", or [\"*\"] for all fields");
        return fields;
    }
    for (const auto& [name, line] : names) {
        if (name.empty() || name.size() > EntryFields::longestName) {
            section.problem(line, "keep", "'" + name + "' is not the name of a field",
                            "write 1 to " + std::to_string(EntryFields::longestName) + " bytes");
        } else if (name.starts_with("field.")) {
            section.problem(line, "keep", "'" + name + "' begins with 'field.'",
                            "write '" + name.substr(6) + "'");
        } else {
            fields.push_back(name);
        }
    }
    return fields;
}

void LogReader::readKeep(ConfigSection& section, LogConfig& log) {
    const std::string noMeaning = "has no meaning for type \"" + log.type + '"';
    const bool isFormatted = log.letter == FormatLogFile::typeLetter || log.journal ||
                             (log.command && log.follow.format);
    if (log.letter != 'S' && !isFormatted) {
        section.refuse("keep", noMeaning);
    }
    const bool isRecords = log.follow.format && log.follow.format->recordLength() != 0;
    const bool hasText = log.letter == 'S' || log.letter == 'U' || isFormatted || log.isSource();
    if (isRecords || !hasText) {
        section.refuse("entry_bytes", noMeaning);
    }
    if (const auto names = section.texts("keep")) {
        log.follow.keep.fields = namesOfFields(section, *names);
    }
    constexpr std::int64_t most = EntryKeep::longestText;
    if (const std::optional<std::int64_t> bytes = section.number("entry_bytes")) {
        if (*bytes < 0 || *bytes > most) {
            section.problem("entry_bytes", std::to_string(*bytes) + " is out of bounds",
                            "write a number from 0 to " + std::to_string(most));
        } else {
            log.follow.keep.textBytes = static_cast<std::size_t>(*bytes);
        }
    }
}

} // namespace zrm::host
