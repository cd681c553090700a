#ifndef ZRM_HOST_PATTERN_CHOICES_H
#define ZRM_HOST_PATTERN_CHOICES_H

#include "host/formats/PatternCode.h"

#include <cstddef>

namespace zrm::host {

/// Looks at what can follow each instruction of finished code, so that a program makes choices only
/// where there are two ways.
class PatternChoices {
public:
    explicit PatternChoices(PatternCode& code) : m_code(code) {}

    void decide();

private:
    using Op = PatternCode::Op;
    using Instruction = PatternCode::Instruction;

    void decideAt(std::size_t place);
    ByteSet beginningAt(std::size_t place) const;
    bool leadsToMatch(std::size_t place) const;

    PatternCode& m_code;
};

} // namespace zrm::host

#endif
