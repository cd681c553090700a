#include "host/config/EntryLinesReader.h"

#include "host/base/TimeText.h"

#include <chrono>
#include <cstdint>
#include <string>

namespace zrm::host {

namespace {

constexpr std::int64_t mostLines = 10'000;
constexpr std::chrono::minutes longestWait{1};

/// Reads a number that has a range. Leaves the value alone if the key is missing or wrong.
void readNumber(ConfigSection& section, const char* key, std::int64_t most, std::size_t& value) {
    const std::optional<std::int64_t> number = section.number(key);
    if (number && (*number < 2 || *number > most)) {
        section.problem(key,
                        std::to_string(*number) + " is not between 2 and " + std::to_string(most),
                        "write a number in that range");
    } else if (number) {
        value = static_cast<std::size_t>(*number);
    }
}

void readWait(ConfigSection& section, LineJoin::Limits& limits) {
    const std::optional<std::string> text = section.text("wait");
    if (!text) {
        return;
    }
    const std::optional<std::chrono::seconds> wait = DurationText::parse(*text);
    if (!wait || *wait > longestWait) {
        section.problem("wait", "'" + *text + "' is not a duration from a second to a minute",
                        "write for example \"2s\"");
    } else {
        limits.wait = *wait;
    }
}

/// Reads an expression; empty if the key is missing.
std::string readPattern(ConfigSection& section, const char* key) {
    const std::optional<std::string> pattern = section.text(key);
    if (pattern && pattern->empty()) {
        section.problem(key, "is empty", "write a regular expression");
    }
    return pattern.value_or("");
}

} // namespace

EntryLines EntryLinesReader::read(ConfigSection& section) {
    EntryLines lines;
    std::optional<ConfigSection> entry = section.section("entry");
    if (!entry) {
        return lines;
    }
    const std::size_t problems = section.problemCount();
    lines.starts = readPattern(*entry, "starts");
    lines.continues = readPattern(*entry, "continues");
    lines.indented = entry->truth("indented").value_or(false);
    readNumber(*entry, "lines", mostLines, lines.limits.lines);
    readNumber(*entry, "bytes", LineJoin::mostBytes, lines.limits.bytes);
    readWait(*entry, lines.limits);
    entry->refuseUnknownKeys();
    if (!lines.isGiven() && !section.has("unwrap") && section.problemCount() == problems) {
        section.problem("entry", "does not say which lines make an entry",
                        "write starts, continues or indented = true, for example { starts = "
                        "'^\\d{4}-' }");
    }
    return lines;
}

std::shared_ptr<const LineJoin> EntryLinesReader::make(ConfigSection& section,
                                                       const FormatDescription& description) {
    auto join = makeLineJoin(description);
    if (!join) {
        const Problem& problem = join.error();
        section.problem(section.line(problem.field.substr(0, problem.field.find('.'))),
                        problem.field, problem.what, problem.cure);
        return nullptr;
    }
    return std::move(*join);
}

} // namespace zrm::host
