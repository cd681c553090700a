#include "host/formats/PatternChoices.h"

#include <vector>

namespace zrm::host {

void PatternChoices::decide() {
    for (std::size_t place = 0; place < m_code.instructions.size() && !m_code.isTooLarge();
         ++place) {
        decideAt(place);
    }
}

/// What can come at a place of the finished code.
ByteSet PatternChoices::beginningAt(std::size_t place) const {
    ByteSet beginning;
    const std::vector<Instruction>& code = m_code.instructions;
    std::vector<bool> seen(code.size());
    std::vector<std::size_t> places{place};
    while (!places.empty()) {
        const std::size_t at = places.back();
        places.pop_back();
        if (seen[at]) {
            continue;
        }
        seen[at] = true;
        const Instruction& instruction = code[at];
        switch (instruction.op) {
        case Op::byte:
            beginning.add(instruction.byte);
            break;
        case Op::literal:
            beginning.add(static_cast<unsigned char>(m_code.literals[instruction.set]));
            break;
        case Op::whole:
        case Op::greedy:
        case Op::lazy:
            beginning.addAll(m_code.sets[instruction.set]);
            if (instruction.least == 0) {
                places.push_back(at + 1);
            }
            break;
        case Op::split:
            places.push_back(at + 1);
            [[fallthrough]];
        case Op::jump:
            places.push_back(at + static_cast<std::size_t>(instruction.target));
            break;
        case Op::save:
            places.push_back(at + 1);
            break;
        case Op::atEnd:
            beginning.add(ByteSet::end);
            break;
        case Op::match:
            for (std::size_t byte = 0; byte <= ByteSet::end; ++byte) {
                beginning.add(byte);
            }
            break;
        }
    }
    return beginning;
}

/// Whether nothing is left to do but to save places.
bool PatternChoices::leadsToMatch(std::size_t place) const {
    const std::vector<Instruction>& code = m_code.instructions;
    for (std::size_t steps = 0; steps < code.size(); ++steps) {
        switch (code[place].op) {
        case Op::match:
            return true;
        case Op::save:
            ++place;
            break;
        case Op::jump:
            place += static_cast<std::size_t>(code[place].target);
            break;
        default:
            return false;
        }
    }
    return false;
}

void PatternChoices::decideAt(std::size_t place) {
    Instruction& instruction = m_code.instructions[place];
    if (instruction.op == Op::split) {
        instruction.set = m_code.indexOf(beginningAt(place + 1));
        instruction.next =
            m_code.indexOf(beginningAt(place + static_cast<std::size_t>(instruction.target)));
    } else if (instruction.op == Op::greedy || instruction.op == Op::lazy) {
        const ByteSet behind = beginningAt(place + 1);
        const bool isClear = !behind.intersects(m_code.sets[instruction.set]);
        const bool isOver = instruction.op == Op::greedy && leadsToMatch(place + 1);
        if (instruction.least == instruction.most || isClear || isOver) {
            instruction.op = Op::whole;
        }
        instruction.next = m_code.indexOf(behind);
    }
}

} // namespace zrm::host
