#ifndef ZRM_HOST_PATTERN_COMPILER_H
#define ZRM_HOST_PATTERN_COMPILER_H

#include "host/formats/PatternBytes.h"

#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Makes the code of one expression. What it does not know ends it without any.
class PatternCompiler {
public:
    explicit PatternCompiler(std::string_view pattern) : m_rest(pattern) {}

    std::optional<PatternCode> code();

private:
    using Instruction = PatternCode::Instruction;
    using Op = PatternCode::Op;
    /// Targets lie within, or right behind the end.
    using Code = std::vector<Instruction>;

    /// How often something comes.
    struct Count {
        std::uint32_t least = 1;
        std::uint32_t most = 1;
        bool isLazy = false;
    };

    // The parts of an expression, from the outermost on. None: it is not known.
    std::optional<Code> alternatives(std::size_t depth, bool isCaptured);
    std::optional<Code> sequence(std::size_t depth);
    std::optional<Code> group(std::size_t depth);
    std::optional<Code> piece(std::size_t depth);
    std::optional<Count> count();
    std::optional<std::uint32_t> number();

    bool take(std::string_view text);
    void takeFlags();
    bool takeGroupName();
    static void takeAsRun(Code& branch);
    void append(Code& before, const Code& code);
    bool appendByte(Code& code, const Code& piece);
    Code runOf(const ByteSet& set, const Count& count);
    static std::optional<Code> repeated(const Code& body, const Count& count);
    static bool canBeEmpty(const Code& body);

    static constexpr std::size_t mostDepth = 30;
    static constexpr std::size_t mostInstructions = 2000;

    std::string_view m_rest;
    PatternBytes::Flags m_flags;
    bool m_isTooLarge = false;
    PatternCode m_code;
};

} // namespace zrm::host

#endif
