#ifndef ZRM_LINE_SHAPES_H
#define ZRM_LINE_SHAPES_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string_view>

namespace zrm {

/// How often lines of the same shape were noted. A shape is the beginning of a line with every
/// number as "9" and every word as "a": "[9] a: a=9". Keeps the most frequent ones of any number of
/// shapes in a fixed room, which the first line allocates; without memory it keeps none. Not
/// locked.
class LineShapes {
public:
    static constexpr std::size_t mostKept = 20;
    static constexpr std::size_t longest = 80; ///< bytes of a shape

    struct Shape {
        std::int64_t count; ///< at least as often; exact while there were at most `mostKept` shapes
        std::size_t length;
        char text[longest];

        std::string_view view() const noexcept { return {text, length}; }
    };

    void note(std::string_view line) noexcept;
    /// Copies the shapes, the most frequent first, to an array of mostKept. Returns their number.
    std::size_t copy(Shape* out) const noexcept;

private:
    struct Slot {
        Shape shape;
        std::int64_t before; ///< what the slot had counted of other shapes
    };

    Slot* slotOf(std::string_view shape) noexcept;

    std::unique_ptr<Slot[]> m_slots; ///< mostKept of them, or null
    std::size_t m_used = 0;
};

} // namespace zrm

#endif
