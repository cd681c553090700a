#include "host/formats/PatternProgram.h"

#include "host/formats/PatternCompiler.h"

#include <algorithm>
#include <cstring>

namespace zrm::host {

/// One match. Where it has a choice, it takes what is preferred and remembers the rest; when it
/// does not get on, it goes back to the last choice.
class PatternProgram::Run {
public:
    using Op = PatternCode::Op;
    using Instruction = PatternCode::Instruction;

    // cppcheck-suppress uninitMemberVar ; no choice is read before it is made
    Run(const PatternCode& code, std::string_view text, const char** places) noexcept
        : m_sets(code.sets.data()), m_literals(code.literals.data()), m_places(places),
          m_end(text.data() + text.size()), m_mostWork(4 * text.size() + 1024),
          m_pc(code.instructions.data()), m_at(text.data()) {}

    Outcome outcome() noexcept {
        for (;;) {
            if (m_pc->op == Op::match) {
                return Outcome::match;
            }
            if (!step() && !goBack()) {
                return m_hasGivenUp ? Outcome::unknown : Outcome::noMatch;
            }
        }
    }

private:
    enum class Rest : unsigned char { place, otherWay, fewer, more };

    /// What a choice has left.
    struct Choice {
        Rest rest;
        const Instruction* pc;
        const char* at;    ///< of a place: what it was
        const char* least; ///< of a run: where the shortest one ends
    };
    static constexpr std::size_t mostChoices = 128;

    static std::size_t byteAt(const char* at) noexcept { return static_cast<unsigned char>(*at); }
    std::size_t next() const noexcept { return m_at == m_end ? ByteSet::end : byteAt(m_at); }

    /// Executes an instruction. Returns false if the text is not so.
    bool step() noexcept {
        const Instruction& instruction = *m_pc++;
        switch (instruction.op) {
        case Op::byte:
            return m_at != m_end && byteAt(m_at++) == instruction.byte;
        case Op::literal:
            return takeLiteral(instruction);
        case Op::whole:
            return takeRun(instruction);
        case Op::greedy:
            return takeGreedy(instruction);
        case Op::lazy:
            return takeLazy(instruction);
        case Op::split:
            return choose(instruction);
        case Op::jump:
            m_pc = &instruction + instruction.target;
            return true;
        case Op::save:
            save(instruction);
            return true;
        default:
            return m_at == m_end;
        }
    }
    bool takeLiteral(const Instruction& instruction) noexcept {
        const std::size_t length = instruction.length;
        if (static_cast<std::size_t>(m_end - m_at) < length ||
            std::memcmp(m_at, m_literals + instruction.set, length) != 0) {
            return false;
        }
        m_at += length;
        return true;
    }
    /// Takes as many bytes of the set as there are. Returns false if these are too few.
    bool takeRun(const Instruction& instruction) noexcept {
        const ByteSet& set = m_sets[instruction.set];
        const char* const begin = m_at;
        const char* const end = static_cast<std::size_t>(m_end - begin) > instruction.most
                                    ? begin + instruction.most
                                    : m_end;
        const char* at = begin;
        while (at != end && set[byteAt(at)]) {
            ++at;
        }
        m_at = at;
        m_work += static_cast<std::size_t>(at - begin);
        return static_cast<std::size_t>(at - begin) >= instruction.least;
    }
    bool takeGreedy(const Instruction& instruction) noexcept {
        const char* const begin = m_at;
        if (!takeRun(instruction)) {
            return false;
        }
        const char* const least = begin + instruction.least;
        return m_at == least || remember(Rest::fewer, m_pc, m_at, least);
    }
    bool takeLazy(const Instruction& instruction) noexcept {
        const ByteSet& set = m_sets[instruction.set];
        for (std::uint32_t count = 0; count < instruction.least; ++count) {
            if (m_at == m_end || !set[byteAt(m_at)]) {
                return false;
            }
            ++m_at;
        }
        return extend(instruction);
    }
    /// Goes on to where the rest can begin.
    bool extend(const Instruction& instruction) noexcept {
        const ByteSet& set = m_sets[instruction.set];
        const ByteSet& behind = m_sets[instruction.next];
        const char* const begin = m_at;
        bool canExtend = true;
        while (canExtend && !behind[next()]) {
            canExtend = m_at != m_end && set[byteAt(m_at)];
            m_at += canExtend ? 1 : 0;
        }
        m_work += static_cast<std::size_t>(m_at - begin);
        return canExtend && remember(Rest::more, &instruction, m_at, nullptr);
    }
    bool choose(const Instruction& instruction) noexcept {
        const std::size_t byte = next();
        const Instruction* const other = &instruction + instruction.target;
        if (!m_sets[instruction.set][byte]) {
            m_pc = other;
            return true;
        }
        return !m_sets[instruction.next][byte] || remember(Rest::otherWay, other, m_at, nullptr);
    }
    void save(const Instruction& instruction) noexcept {
        const char*& place = m_places[instruction.length];
        if (m_count == 0 || remember(Rest::place, &instruction, place, nullptr)) {
            place = m_at;
        }
    }
    /// False if there are too many choices.
    bool remember(Rest rest, const Instruction* pc, const char* at, const char* least) noexcept {
        if (m_count == mostChoices) {
            m_hasGivenUp = true;
            return false;
        }
        m_choices[m_count++] = {rest, pc, at, least};
        return true;
    }
    /// Returns false if no choice is left.
    bool goBack() noexcept {
        m_hasGivenUp |= ++m_work > m_mostWork;
        while (m_count > 0 && !m_hasGivenUp) {
            const Choice choice = m_choices[--m_count];
            if (take(choice)) {
                return true;
            }
        }
        return false;
    }
    bool take(const Choice& choice) noexcept {
        m_at = choice.at;
        m_pc = choice.pc;
        switch (choice.rest) {
        case Rest::place:
            m_places[choice.pc->length] = choice.at;
            return false;
        case Rest::otherWay:
            return true;
        case Rest::more: {
            ++m_pc;
            const bool canGrow = m_at != m_end && m_sets[choice.pc->set][byteAt(m_at)];
            m_at += canGrow ? 1 : 0;
            return canGrow && extend(*choice.pc);
        }
        case Rest::fewer:
            break;
        }
        const ByteSet& behind = m_sets[(choice.pc - 1)->next];
        while (m_at != choice.least) {
            --m_at;
            ++m_work;
            if (behind[byteAt(m_at)]) {
                return m_at == choice.least || remember(Rest::fewer, m_pc, m_at, choice.least);
            }
        }
        return false;
    }

    const ByteSet* const m_sets;
    const char* const m_literals;
    const char** const m_places;
    const char* const m_end;
    const std::size_t m_mostWork; ///< bytes looked at, before the library gets the entry

    const Instruction* m_pc;
    const char* m_at;
    std::size_t m_work = 0;
    bool m_hasGivenUp = false;
    std::size_t m_count = 0;
    Choice m_choices[mostChoices];
};

std::optional<PatternProgram> PatternProgram::compile(std::string_view pattern) {
    std::optional<PatternCode> code = PatternCompiler(pattern).code();
    return code ? std::optional(PatternProgram(std::move(*code))) : std::nullopt;
}

PatternProgram::Outcome PatternProgram::match(std::string_view text,
                                              std::vector<const char*>& places) const noexcept {
    std::fill_n(places.begin(), 2 * m_code.groups, nullptr);
    Run run(m_code, text, places.data());
    return run.outcome();
}

} // namespace zrm::host
