#ifndef ZRM_HOST_TEXT_TEMPLATE_H
#define ZRM_HOST_TEXT_TEMPLATE_H

#include "host/base/Result.h"
#include "host/framework/Condition.h"

#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// The text of a situation taken apart: names in braces stand for what each event has in their
/// place. A text in which no name is known has no places: it is the same for all events, braces
/// included, since texts of before there were places may have them. In any other text "{{" and "}}"
/// stand for braces, and a brace that begins a name must be ended.
class TextTemplate {
public:
    struct Piece {
        enum class Kind : unsigned char { literal, value, count, first, last, log, situation };
        Kind kind = Kind::literal;
        std::string text = {}; ///< of a literal; of a value: its name
    };

    /// The conditions are those of the situation. Refuses unknown names beside known ones.
    static Result<TextTemplate> parse(std::string_view text,
                                      const std::vector<Condition>& conditions);

    /// False: all events have the text as it is written.
    bool hasPlaces() const noexcept { return !m_pieces.empty(); }
    const std::vector<Piece>& pieces() const noexcept { return m_pieces; }
    /// Of a text without places: why the first name in braces in it is not one. No text: there is
    /// none.
    const Problem& ignored() const noexcept { return m_ignored; }

private:
    std::vector<Piece> m_pieces;
    Problem m_ignored;
};

} // namespace zrm::host

#endif
