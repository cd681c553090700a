#include "host/formats/EntryPattern.h"

#include <array>
#include <utility>

#include <re2/re2.h>

namespace zrm::host {

namespace {

constexpr std::int64_t mostMemory = 8 << 20;

re2::StringPiece pieceOf(std::string_view text) {
    return {text.data(), text.size()};
}

} // namespace

EntryPattern::EntryPattern(std::unique_ptr<re2::RE2> expression)
    : m_expression(std::move(expression)),
      m_names(static_cast<std::size_t>(m_expression->NumberOfCapturingGroups())),
      m_program(PatternProgram::compile(m_expression->pattern())) {
    for (const auto& [number, name] : m_expression->CapturingGroupNames()) {
        m_names[static_cast<std::size_t>(number) - 1] = name;
    }
}

EntryPattern::EntryPattern(EntryPattern&& other) noexcept = default;
EntryPattern& EntryPattern::operator=(EntryPattern&& other) noexcept = default;
EntryPattern::~EntryPattern() = default;

Result<EntryPattern> EntryPattern::compile(const std::string& expression) {
    if (expression.size() > longest) {
        return refused("the expression is longer than " + std::to_string(longest) + " bytes",
                       "write several that are tried in order");
    }
    re2::RE2::Options options;
    options.set_encoding(re2::RE2::Options::EncodingLatin1);
    options.set_log_errors(false);
    options.set_max_mem(mostMemory);
    auto compiled = std::make_unique<re2::RE2>(pieceOf(expression), options);
    if (!compiled->ok()) {
        return refused("'" + expression + "' is not a regular expression: " + compiled->error(),
                       "write one in the syntax of RE2, with captures such as (?P<time>...)");
    }
    if (compiled->NumberOfCapturingGroups() > static_cast<int>(mostCaptures)) {
        return refused("the expression has more than " + std::to_string(mostCaptures) + " groups",
                       "write (?:...) for groups that capture nothing");
    }
    if (compiled->NamedCapturingGroups().empty()) {
        return refused("'" + expression + "' has no named capture",
                       "name what it reads, as in (?P<time>...)");
    }
    return EntryPattern(std::move(compiled));
}

bool EntryPattern::match(std::string_view text, Captures& captures, Workspace& workspace) const {
    if (text.empty()) {
        text = ""; // views of nothing have data as well
    }
    captures.resize(m_names.size());
    if (m_program) {
        std::vector<const char*>& places = workspace.places;
        places.resize(2 * m_program->groups());
        const PatternProgram::Outcome outcome = m_program->match(text, places);
        if (outcome == PatternProgram::Outcome::match) {
            for (std::size_t index = 0; index < captures.size(); ++index) {
                const char* const begin = places[2 * index];
                const char* const end = places[2 * index + 1];
                captures[index] = begin != nullptr && end != nullptr ? std::string_view(begin, end)
                                                                     : std::string_view();
            }
            return true;
        }
        if (outcome == PatternProgram::Outcome::noMatch) {
            return false;
        }
    }
    return matchByLibrary(text, captures);
}

bool EntryPattern::matchByLibrary(std::string_view text, Captures& captures) const {
    std::array<re2::StringPiece, mostCaptures + 1> groups;
    if (!m_expression->Match(pieceOf(text), 0, text.size(), re2::RE2::ANCHOR_START, groups.data(),
                             static_cast<int>(captures.size()) + 1)) {
        return false;
    }
    for (std::size_t index = 0; index < captures.size(); ++index) {
        captures[index] = {groups[index + 1].data(), groups[index + 1].size()};
    }
    return true;
}

} // namespace zrm::host
