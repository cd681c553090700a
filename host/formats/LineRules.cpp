#include "host/formats/LineRules.h"

#include "host/formats/FormatDescription.h"

#include <array>
#include <utility>

namespace zrm::host {

namespace {

/// Compiles the expression of a key; none if it is not given.
Result<std::optional<LinePattern>> compile(const std::string& pattern, const char* key) {
    if (pattern.empty()) {
        return std::optional<LinePattern>();
    }
    Result<LinePattern> compiled = LinePattern::compile(pattern);
    if (!compiled) {
        compiled.error().field = key;
        return tl::unexpected(std::move(compiled.error()));
    }
    return std::optional(std::move(*compiled));
}

Result<void> checkLines(const EntryLines& lines) {
    if (!lines.starts.empty() + !lines.continues.empty() + lines.indented > 1) {
        return refused("says in more than one way which lines make an entry",
                       "keep one of starts, continues and indented", "entry");
    }
    if (lines.limits.lines < 2) {
        return refused("is less than 2", "write how many lines an entry has at most",
                       "entry.lines");
    }
    if (lines.limits.bytes < 2 || lines.limits.bytes > LineJoin::mostBytes) {
        return refused("is not between 2 and 65536", "write how many bytes an entry has at most",
                       "entry.bytes");
    }
    return {};
}

/// The calling thread's, since the rules are shared by all threads.
Unwrapper& unwrapperOf(Unwrapper::Kind kind) {
    thread_local std::array<std::unique_ptr<Unwrapper>, 2> unwrappers;
    std::unique_ptr<Unwrapper>& unwrapper = unwrappers[static_cast<std::size_t>(kind)];
    if (!unwrapper) {
        unwrapper = std::make_unique<Unwrapper>(kind);
    }
    return *unwrapper;
}

std::string definitionOf(const FormatDescription& description) {
    const EntryLines& lines = description.lines;
    std::string text = description.unwrap;
    for (const std::string& part :
         {lines.starts, lines.continues, std::string(lines.indented ? "indented" : ""),
          std::to_string(lines.limits.lines), std::to_string(lines.limits.bytes),
          std::to_string(lines.limits.wait.count())}) {
        text += '\n' + part;
    }
    return text;
}

} // namespace

Result<std::shared_ptr<const LineJoin>> LineRules::make(const FormatDescription& description) {
    const EntryLines& lines = description.lines;
    Parts parts;
    if (!description.unwrap.empty()) {
        parts.unwrap = Unwrapper::kindOf(description.unwrap);
        if (!parts.unwrap) {
            return refused("is not a container runtime's format", R"(write "docker" or "cri")",
                           "unwrap");
        }
    }
    if (!lines.isGiven() && !parts.unwrap) {
        return std::shared_ptr<const LineJoin>();
    }
    auto starts = compile(lines.starts, "entry.starts");
    auto continues = compile(lines.continues, "entry.continues");
    for (const auto* const pattern : {&starts, &continues}) {
        if (!*pattern) {
            return tl::unexpected(pattern->error());
        }
    }
    if (auto checked = checkLines(lines); !checked) {
        return tl::unexpected(std::move(checked.error()));
    }
    parts.starts = std::move(*starts);
    parts.continues = std::move(*continues);
    parts.isIndented = lines.indented;
    return std::shared_ptr<const LineJoin>(new LineRules(description, std::move(parts)));
}

LineRules::LineRules(const FormatDescription& description, Parts parts)
    : LineJoin(description.lines.limits), m_parts(std::move(parts)),
      m_definition(definitionOf(description)) {}

bool LineRules::continues(std::string_view before, std::string_view line) const {
    return m_parts.unwrap ? continuesWrapped(before, line) : continuesByRule(line);
}

bool LineRules::mayBeContinued(std::string_view line) const {
    if (!m_parts.isOnlyUnwrap()) {
        return true;
    }
    Unwrapper& unwrapper = unwrapperOf(*m_parts.unwrap);
    return unwrapper.read(line) && unwrapper.isUnfinished();
}

/// By what a program has written, to one stream. Lines that are not the runtime's are entries,
/// which the format rejects.
bool LineRules::continuesWrapped(std::string_view before, std::string_view line) const {
    Unwrapper& unwrapper = unwrapperOf(*m_parts.unwrap);
    if (!unwrapper.read(before)) {
        return false;
    }
    const bool isUnfinished = unwrapper.isUnfinished();
    constexpr std::size_t enough = 8; // of the name of a stream
    std::array<char, enough> stream{};
    const std::size_t length = unwrapper.stream().copy(stream.data(), stream.size());
    return unwrapper.read(line) &&
           unwrapper.stream().substr(0, enough) == std::string_view(stream.data(), length) &&
           (isUnfinished || continuesByRule(unwrapper.text()));
}

bool LineRules::continuesByRule(std::string_view line) const {
    if (m_parts.starts) {
        return !m_parts.starts->matches(line);
    }
    if (m_parts.continues) {
        return m_parts.continues->matches(line);
    }
    // An empty line is usually part of what is indented around it.
    return m_parts.isIndented && (line.empty() || line.front() == ' ' || line.front() == '\t');
}

Result<std::shared_ptr<const LineJoin>> makeLineJoin(const FormatDescription& description) {
    return LineRules::make(description);
}

} // namespace zrm::host
