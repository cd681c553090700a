#ifndef ZRM_HOST_PATTERN_CODE_H
#define ZRM_HOST_PATTERN_CODE_H

#include <array>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <string>
#include <vector>

namespace zrm::host {

/// Some of the bytes, and maybe the end of the text.
class ByteSet {
public:
    static constexpr std::size_t end = 256;

    bool operator[](std::size_t byte) const noexcept { return m_has[byte] != 0; }
    void add(std::size_t byte) noexcept { m_has[byte] = 1; }
    void addAll(const ByteSet& other) noexcept;
    bool intersects(const ByteSet& other) const noexcept;
    /// Of the bytes.
    void invert() noexcept;
    std::size_t count() const noexcept;
    bool operator==(const ByteSet&) const = default;

private:
    std::array<unsigned char, 257> m_has{};
};

/// What a PatternProgram executes.
struct PatternCode {
    enum class Op : unsigned char {
        byte,    ///< `byte` comes next
        literal, ///< `length` bytes of the literals from `set` on come next
        whole,   ///< bytes of a set, as many as there are: fewer would not do
        greedy,  ///< bytes of a set, rather more
        lazy,    ///< bytes of a set, rather fewer
        split,   ///< go on at the next instruction or, less preferred, at the target
        jump,    ///< go on at the target
        save,    ///< this is one of the places
        atEnd,   ///< this is the end of the text
        match,
    };
    static constexpr std::uint32_t unlimited = std::numeric_limits<std::uint32_t>::max();

    struct Instruction {
        Op op = Op::match;
        unsigned char byte = 0;
        std::uint16_t set =
            0; ///< of the bytes of a run, or of a split: what each way can begin with
        std::uint16_t next = 0;   ///< of a run: what can come behind it
        std::uint16_t length = 0; ///< or which place is saved
        std::uint32_t least = 1;
        std::uint32_t most = 1;
        std::int32_t target = 0; ///< from this instruction
    };

    static constexpr std::size_t mostGroups = 64;
    static constexpr std::size_t mostSets = 500;

    /// The place of a set among the sets, to which it is added.
    std::uint16_t indexOf(const ByteSet& set);
    bool isTooLarge() const noexcept { return sets.size() > mostSets; }

    std::vector<Instruction> instructions;
    std::vector<ByteSet> sets;
    std::string literals;
    std::size_t groups = 0; ///< in the order of their opening brackets
};

} // namespace zrm::host

#endif
