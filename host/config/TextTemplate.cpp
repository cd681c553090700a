#include "host/config/TextTemplate.h"

#include "host/config/EntryNames.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <optional>
#include <utility>

namespace zrm::host {

namespace {

using Piece = TextTemplate::Piece;

/// What events have beside their entries.
constexpr std::array<std::pair<std::string_view, Piece::Kind>, 5> ownNames = {{
    {"count", Piece::Kind::count},
    {"first", Piece::Kind::first},
    {"last", Piece::Kind::last},
    {"log", Piece::Kind::log},
    {"situation", Piece::Kind::situation},
}};

/// A capture has precedence over what all events have, since its name was chosen for this
/// situation.
Result<Piece> pieceOf(std::string_view name, const EntryNames& names) {
    const Result<EntryName> found = names.find(name);
    const auto* const own = std::find_if(ownNames.begin(), ownNames.end(),
                                         [&](const auto& known) { return known.first == name; });
    if (own != ownNames.end() && (!found || found->kind != EntryName::Kind::capture)) {
        return Piece{own->second};
    }
    if (!found) {
        Problem problem = found.error();
        problem.cure += "; count, first, last, log and situation; write {{ for a brace";
        return tl::unexpected(std::move(problem));
    }
    return Piece{Piece::Kind::value, std::string(name)};
}

/// Reads a text from its beginning to its end.
class Reading {
public:
    Reading(std::string_view text, const EntryNames& names) : m_rest(text), m_names(names) {}

    void run() {
        while (!m_rest.empty()) {
            const std::size_t brace = std::min(m_rest.find_first_of("{}"), m_rest.size());
            take(brace);
            if (!m_rest.empty()) {
                atBrace();
            }
        }
    }

    std::vector<Piece> pieces;
    bool hasPlaces = false;
    std::optional<Problem> problem; ///< the first one

private:
    /// Literal text.
    void take(std::size_t size) {
        if (size > 0) {
            if (pieces.empty() || pieces.back().kind != Piece::Kind::literal) {
                pieces.emplace_back();
            }
            pieces.back().text += m_rest.substr(0, size);
            m_rest.remove_prefix(size);
        }
    }

    void atBrace() {
        const bool isDouble = m_rest.size() > 1 && m_rest[0] == m_rest[1];
        if (isDouble) {
            m_rest.remove_prefix(1);
            take(1);
        } else if (m_rest.front() == '}') {
            take(1);
        } else {
            atName();
        }
    }

    void atName() {
        const std::size_t end = m_rest.find_first_of("{}", 1);
        if (end == m_rest.npos || m_rest[end] == '{') {
            note({"has a '{' without a '}'", "write {{ for a brace"});
            take(1);
            return;
        }
        const std::string_view name = m_rest.substr(1, end - 1);
        Result<Piece> piece = pieceOf(name, m_names);
        if (piece) {
            hasPlaces = true;
            pieces.push_back(std::move(*piece));
        } else {
            note({'{' + std::string(name) + "}: " + piece.error().what, piece.error().cure});
        }
        m_rest.remove_prefix(end + 1);
    }

    void note(Problem found) {
        if (!problem) {
            problem = std::move(found);
        }
    }

    std::string_view m_rest;
    const EntryNames& m_names;
};

} // namespace

Result<TextTemplate> TextTemplate::parse(std::string_view text,
                                         const std::vector<Condition>& conditions) {
    TextTemplate result;
    if (text.find('{') == text.npos) {
        return result;
    }
    const EntryNames names(conditions);
    Reading reading(text, names);
    reading.run();
    if (!reading.hasPlaces) {
        result.m_ignored = reading.problem.value_or(Problem());
        return result;
    }
    if (reading.problem) {
        return tl::unexpected(*reading.problem);
    }
    result.m_pieces = std::move(reading.pieces);
    return result;
}

} // namespace zrm::host
