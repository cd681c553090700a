#include "host/formats/PatternCompiler.h"

#include "host/formats/PatternBytes.h"
#include "host/formats/PatternChoices.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

bool PatternCompiler::take(std::string_view text) {
    const bool isNext = m_rest.starts_with(text);
    m_rest.remove_prefix(isNext ? text.size() : 0);
    return isNext;
}

std::optional<PatternCode> PatternCompiler::code() {
    takeFlags();
    std::optional<Code> code = alternatives(0, false);
    if (!code || !m_rest.empty()) {
        return std::nullopt;
    }
    code->push_back({.op = Op::match});
    m_code.instructions = std::move(*code);
    PatternChoices(m_code).decide();
    return m_isTooLarge || m_code.isTooLarge() ? std::nullopt : std::optional(std::move(m_code));
}

/// "(?i)", "(?s)" or both, for all of the expression.
void PatternCompiler::takeFlags() {
    for (const std::string_view flags : {"(?i)", "(?s)", "(?is)", "(?si)"}) {
        if (take(flags)) {
            m_flags.foldsCase = flags.find('i') != flags.npos;
            m_flags.dotIsAnything = flags.find('s') != flags.npos;
            return;
        }
    }
}

void PatternCompiler::append(Code& before, const Code& code) {
    if (before.size() + code.size() > mostInstructions) {
        m_isTooLarge = true;
        return;
    }
    before.insert(before.end(), code.begin(), code.end());
}

std::optional<PatternCompiler::Code> PatternCompiler::alternatives(std::size_t depth,
                                                                   bool isCaptured) {
    std::vector<Code> branches;
    do {
        std::optional<Code> branch = sequence(depth);
        if (!branch) {
            return std::nullopt;
        }
        branches.push_back(std::move(*branch));
    } while (take("|"));
    const bool isLoop =
        (m_rest.starts_with(")*") || m_rest.starts_with(")+")) && m_rest.substr(2, 1) != "?";
    if (isLoop && !isCaptured) {
        std::for_each(branches.begin(), branches.end(), takeAsRun);
    }
    Code code = std::move(branches.back());
    for (auto branch = branches.rbegin() + 1; branch != branches.rend(); ++branch) {
        Code both;
        both.push_back({.op = Op::split, .target = static_cast<std::int32_t>(branch->size() + 2)});
        append(both, *branch);
        both.push_back({.op = Op::jump, .target = static_cast<std::int32_t>(code.size() + 1)});
        append(both, code);
        code = std::move(both);
    }
    return code;
}

/// A loop over single bytes of a set may as well take them as a run.
void PatternCompiler::takeAsRun(Code& branch) {
    if (branch.size() == 1 && branch.front().op == Op::greedy && branch.front().least == 1) {
        branch.front().most = PatternCode::unlimited;
    }
}

std::optional<PatternCompiler::Code> PatternCompiler::sequence(std::size_t depth) {
    if (depth == 0 && !take("^")) {
        take("\\A");
    }
    Code code;
    bool isLiteral = false; // what was added last
    while (!m_rest.empty() && m_rest[0] != '|' && m_rest[0] != ')') {
        if (take("$") || take("\\z")) {
            code.push_back({.op = Op::atEnd});
            isLiteral = false;
            continue;
        }
        const std::optional<Code> next = piece(depth);
        if (!next) {
            return std::nullopt;
        }
        const bool isByte = next->size() == 1 && next->front().op == Op::byte;
        if (!isByte || !isLiteral || !appendByte(code, *next)) {
            append(code, *next);
        }
        isLiteral = isByte;
    }
    return m_isTooLarge ? std::nullopt : std::optional(std::move(code));
}

/// Makes the byte or literal at the end of the code longer.
bool PatternCompiler::appendByte(Code& code, const Code& piece) {
    std::string& literals = m_code.literals;
    Instruction& last = code.back();
    if (last.op == Op::byte) {
        last.op = Op::literal;
        last.set = static_cast<std::uint16_t>(literals.size());
        last.length = 1;
        literals += static_cast<char>(last.byte);
    }
    if (last.set + last.length != literals.size()) {
        return false;
    }
    literals += static_cast<char>(piece.front().byte);
    ++last.length;
    return true;
}

/// A group or some bytes, with what says how often they come.
std::optional<PatternCompiler::Code> PatternCompiler::piece(std::size_t depth) {
    if (m_rest.starts_with('(')) {
        const std::optional<Code> body = group(depth);
        const std::optional<Count> times = count();
        return body && times ? repeated(*body, *times) : std::nullopt;
    }
    const std::optional<ByteSet> set = PatternBytes(m_rest, m_flags).read();
    const std::optional<Count> times = count();
    if (!set || !times || (times->isLazy && times->most != PatternCode::unlimited)) {
        return std::nullopt;
    }
    return runOf(*set, *times);
}

PatternCompiler::Code PatternCompiler::runOf(const ByteSet& set, const Count& count) {
    Instruction run{.least = count.least, .most = count.most};
    if (count.least == 1 && count.most == 1 && set.count() == 1) {
        run.op = Op::byte;
        while (!set[run.byte]) {
            ++run.byte;
        }
        return {run};
    }
    run.op = count.isLazy ? Op::lazy : Op::greedy;
    run.set = m_code.indexOf(set);
    return {run};
}

bool PatternCompiler::takeGroupName() {
    const std::size_t end = m_rest.find('>');
    const bool hasName = take("?P<") && end != m_rest.npos;
    m_rest.remove_prefix(hasName ? end - 2 : 0);
    return hasName;
}

std::optional<PatternCompiler::Code> PatternCompiler::group(std::size_t depth) {
    take("(");
    const bool isCaptured = !take("?:");
    if (depth == mostDepth || (isCaptured && m_rest.starts_with('?') && !takeGroupName()) ||
        (isCaptured && m_code.groups == PatternCode::mostGroups)) {
        return std::nullopt;
    }
    const auto place = static_cast<std::uint16_t>(2 * m_code.groups);
    m_code.groups += isCaptured ? 1 : 0;
    std::optional<Code> body = alternatives(depth + 1, isCaptured);
    if (!body || !take(")")) {
        return std::nullopt;
    }
    if (isCaptured) {
        body->insert(body->begin(), {.op = Op::save, .length = place});
        body->push_back({.op = Op::save, .length = static_cast<std::uint16_t>(place + 1)});
    }
    return body;
}

/// What a group becomes by what says how often it comes.
std::optional<PatternCompiler::Code> PatternCompiler::repeated(const Code& body,
                                                               const Count& count) {
    const bool isOnce = count.least == 1 && count.most == 1;
    const bool isOptional = count.least == 0 && count.most == 1;
    if (isOnce) {
        return body;
    }
    const auto size = static_cast<std::int32_t>(body.size());
    Code code;
    if (isOptional) {
        if (count.isLazy) {
            code.push_back({.op = Op::split, .target = 2});
            code.push_back({.op = Op::jump, .target = size + 1});
        } else {
            code.push_back({.op = Op::split, .target = size + 1});
        }
        code.insert(code.end(), body.begin(), body.end());
        return code;
    }
    if (count.most != PatternCode::unlimited || count.least > 1 || count.isLazy ||
        body.size() > mostInstructions / 2 || canBeEmpty(body)) {
        return std::nullopt;
    }
    if (count.least == 1) {
        code = body;
    }
    code.push_back({.op = Op::split, .target = size + 2});
    code.insert(code.end(), body.begin(), body.end());
    code.push_back({.op = Op::jump, .target = -(size + 1)});
    return code;
}

/// Whether the end can be reached without a byte.
bool PatternCompiler::canBeEmpty(const Code& body) {
    std::vector<bool> seen(body.size());
    std::vector<std::size_t> places{0};
    while (!places.empty()) {
        const std::size_t place = places.back();
        places.pop_back();
        if (place >= body.size()) {
            return true;
        }
        if (seen[place]) {
            continue;
        }
        seen[place] = true;
        const Instruction& instruction = body[place];
        const bool isRun = instruction.op == Op::greedy || instruction.op == Op::lazy;
        const bool jumps = instruction.op == Op::split || instruction.op == Op::jump;
        if (jumps) {
            places.push_back(place + static_cast<std::size_t>(instruction.target));
        }
        if (instruction.op == Op::split || instruction.op == Op::save ||
            instruction.op == Op::atEnd || (isRun && instruction.least == 0)) {
            places.push_back(place + 1);
        }
    }
    return false;
}

std::optional<std::uint32_t> PatternCompiler::number() {
    constexpr std::size_t mostDigits = 4;
    std::uint32_t value = 0;
    std::size_t digits = 0;
    for (; digits < m_rest.size() && m_rest[digits] >= '0' && m_rest[digits] <= '9'; ++digits) {
        value = value * 10 + static_cast<std::uint32_t>(m_rest[digits] - '0');
        if (digits == mostDigits) {
            return std::nullopt;
        }
    }
    m_rest.remove_prefix(digits);
    return digits > 0 ? std::optional(value) : std::nullopt;
}

std::optional<PatternCompiler::Count> PatternCompiler::count() {
    Count count;
    if (take("*")) {
        count = {0, PatternCode::unlimited};
    } else if (take("+")) {
        count = {1, PatternCode::unlimited};
    } else if (take("?")) {
        count = {0, 1};
    } else if (take("{")) {
        const std::optional<std::uint32_t> least = number();
        if (!least) {
            return std::nullopt;
        }
        count = {*least, *least};
        if (take(",")) {
            const bool isOpen = m_rest.starts_with('}');
            const std::optional<std::uint32_t> most =
                isOpen ? std::optional(PatternCode::unlimited) : number();
            if (!most) {
                return std::nullopt;
            }
            count.most = *most;
        }
        if (!take("}") || count.most == 0) {
            return std::nullopt;
        }
    } else {
        return count;
    }
    count.isLazy = take("?");
    return count;
}

} // namespace zrm::host
