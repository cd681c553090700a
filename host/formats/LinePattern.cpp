#include "host/formats/LinePattern.h"

#include <utility>
#include <vector>

#include <re2/re2.h>

namespace zrm::host {

namespace {

constexpr std::int64_t mostMemory = 1024 * 1024;

re2::RE2::Options options() {
    re2::RE2::Options options;
    options.set_encoding(re2::RE2::Options::EncodingLatin1); // logs have bytes of any encoding
    options.set_log_errors(false);
    options.set_never_capture(true);
    options.set_max_mem(mostMemory);
    return options;
}

/// Whether the expression is one of several alternatives, none of which is in a group. True also
/// for what is not worth a closer look.
bool hasAlternatives(std::string_view pattern) {
    if (pattern.find("[:") != std::string_view::npos ||
        pattern.find("\\Q") != std::string_view::npos) {
        return true;
    }
    std::size_t depth = 0;
    bool isInBrackets = false;
    for (std::size_t at = 0; at < pattern.size(); ++at) {
        const char character = pattern[at];
        if (character == '\\') {
            ++at;
        } else if (isInBrackets) {
            isInBrackets = character != ']';
        } else if (character == '[') {
            isInBrackets = true;
            at += pattern.substr(at + 1).starts_with('^') ? 1 : 0;
            at += pattern.substr(at + 1).starts_with(']') ? 1 : 0; // stands for itself
        } else if (character == '(') {
            ++depth;
        } else if (character == ')') {
            --depth;
        } else if (character == '|' && depth == 0) {
            return true;
        }
    }
    return false;
}

/// Whether all matches are at the beginning of a line.
bool isAnchored(std::string_view pattern) {
    constexpr std::string_view repetitions = "*+?{";
    const bool isRepeated =
        pattern.size() > 1 && repetitions.find(pattern[1]) != std::string_view::npos;
    return pattern.starts_with('^') && !isRepeated && !hasAlternatives(pattern);
}

} // namespace

Result<LinePattern> LinePattern::compile(const std::string& pattern) {
    if (pattern.empty() || pattern.size() > longest) {
        return refused("a regular expression has 1 to 4096 bytes, and this one has " +
                           std::to_string(pattern.size()),
                       "write another one");
    }
    auto expression = std::make_unique<const re2::RE2>(pattern, options());
    if (!expression->ok()) {
        return refused("'" + pattern + "' is not a regular expression: " + expression->error(),
                       "see github.com/google/re2/wiki/Syntax");
    }
    return LinePattern(std::move(expression));
}

LinePattern::LinePattern(std::unique_ptr<const re2::RE2> expression)
    : m_expression(std::move(expression)) {
    m_mayBegin.fill(true);
    const std::string_view pattern = m_expression->pattern();
    if (!isAnchored(pattern)) {
        return;
    }
    m_program = PatternProgram::compile(pattern.substr(1));
    std::string least;
    std::string most;
    if (m_expression->PossibleMatchRange(&least, &most, 1) && !least.empty() && !most.empty()) {
        for (std::size_t byte = 0; byte < m_mayBegin.size(); ++byte) {
            m_mayBegin[byte] = byte >= static_cast<unsigned char>(least.front()) &&
                               byte <= static_cast<unsigned char>(most.front());
        }
    }
}

LinePattern::LinePattern(LinePattern&&) noexcept = default;
LinePattern& LinePattern::operator=(LinePattern&&) noexcept = default;
LinePattern::~LinePattern() = default;

bool LinePattern::matches(std::string_view line) const {
    if (!line.empty() && !m_mayBegin[static_cast<unsigned char>(line.front())]) {
        return false;
    }
    if (m_program) {
        thread_local std::vector<const char*> places;
        places.resize(2 * m_program->groups());
        const PatternProgram::Outcome outcome = m_program->match(line, places);
        if (outcome != PatternProgram::Outcome::unknown) {
            return outcome == PatternProgram::Outcome::match;
        }
    }
    return m_expression->Match(line, 0, line.size(), re2::RE2::UNANCHORED, nullptr, 0);
}

} // namespace zrm::host
