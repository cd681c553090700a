#include "host/diagnose/LineHeads.h"

#include "host/diagnose/LineWords.h"

#include <algorithm>
#include <map>
#include <set>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

using Kind = LineToken::Kind;
using Line = std::vector<LineToken>;

constexpr std::size_t furthestTime = 16;  ///< tokens
constexpr std::size_t furthestLevel = 12; ///< tokens behind the time, or behind the beginning
constexpr std::size_t mostWords = 2;      ///< between the time and a level that most lines lack
constexpr std::size_t leastPercent = 4;   ///< of the lines must have their level at one place
constexpr std::size_t leastLone = 50;     ///< the same, of levels between plain words

bool isEnclosed(const Line& line, std::size_t at) {
    return at > 0 && at + 1 < line.size() && line[at - 1].kind == Kind::mark &&
           line[at + 1].kind == Kind::mark;
}

/// The same, by marks that stand for nothing else.
bool isBracketed(const Line& line, std::size_t at) {
    constexpr std::string_view opening = "[(<{*|\t\"";
    return isEnclosed(line, at) && opening.find(line[at - 1].mark) != std::string_view::npos;
}

bool isUpper(std::string_view word) {
    return std::all_of(word.begin(), word.end(), [](char c) { return c >= 'A' && c <= 'Z'; });
}

/// The place of the time; the number of tokens if there is none.
std::size_t timeOf(const Line& line) {
    for (std::size_t at = 0; at < std::min(line.size(), furthestTime); ++at) {
        if (line[at].kind == Kind::time) {
            return at;
        }
    }
    return line.size();
}

/// The number of words and names between two tokens.
std::size_t wordsBetween(const Line& line, std::size_t from, std::size_t to) {
    return static_cast<std::size_t>(std::count_if(
        line.begin() + static_cast<std::ptrdiff_t>(from),
        line.begin() + static_cast<std::ptrdiff_t>(to), [](const LineToken& token) {
            return token.kind == Kind::word || token.kind == Kind::name || token.kind == Kind::path;
        }));
}

/// How much a token looks like the level of an entry, and not like a word of its message.
enum class Likeness : unsigned char { none, lone, good };

Likeness likeness(const Line& line, std::size_t at, std::size_t time) {
    const LineToken& token = line[at];
    const bool isNext = at == 0 || line[at - 1].kind == Kind::mark || at == time + 1;
    const bool isMarked = at + 1 < line.size() && line[at + 1].kind == Kind::mark;
    const bool isDeep = at > time && wordsBetween(line, time, at) > mostWords;
    if (token.kind == Kind::severity) {
        return Likeness::good;
    }
    if (token.kind == Kind::level) {
        const bool isClear = isClearLevelName(token.text);
        const bool isPadded = at > 0 && line[at - 1].blanks > 1;
        if (isBracketed(line, at)) {
            return Likeness::good;
        }
        if (isDeep) {
            return isUpper(token.text) && isClear ? Likeness::lone : Likeness::none;
        }
        if ((isNext && token.blanks > 1) || (isClear && (isNext || isMarked)) ||
            (isUpper(token.text) && (isNext || isPadded))) {
            return Likeness::good;
        }
        return isClear || (isUpper(token.text) && isBracketLevel(token.text)) ? Likeness::lone
                                                                              : Likeness::none;
    }
    const bool isLetter =
        token.kind == Kind::letter &&
        (isEnclosed(line, at) || (isNext && at + 1 < line.size()) || at + 1 == time ||
         (at > 0 && line[at - 1].blanks > 1 && token.blanks > 0));
    return isLetter ? Likeness::good : Likeness::none;
}

/// The place of the level; the number of tokens if there is none.
std::size_t levelOf(const Line& line, std::size_t time, Likeness least) {
    const std::size_t from = time == line.size() ? 0 : time;
    const std::size_t most = std::min(line.size(), from + furthestLevel);
    for (const Kind kind : {Kind::severity, Kind::level, Kind::letter}) {
        for (std::size_t at = 0; at < most; ++at) {
            if (line[at].kind == kind && likeness(line, at, time) >= least) {
                return at;
            }
        }
    }
    return line.size();
}

/// A level between other words is one if most lines have one at its place and nowhere else.
bool hasLoneLevels(const std::vector<Line>& lines) {
    std::map<std::size_t, std::size_t> places;
    std::size_t most = 0;
    for (const Line& line : lines) {
        const std::size_t time = timeOf(line);
        const std::size_t at = levelOf(line, time, Likeness::lone);
        if (at < line.size() && levelOf(line, time, Likeness::good) == line.size()) {
            most = std::max(most, ++places[at]);
        }
    }
    return most * 100 >= lines.size() * leastLone;
}

/// "org.example.shop.Cart" and "c.e.s.Cart": no message begins so.
bool isLoggerName(std::string_view text) {
    return std::ranges::count(text, '.') > 1 && text.find_first_of("/:@(<") == text.npos;
}

/// Whether a name and its colon follow, brackets, marks and numbers aside.
bool isBeforeName(const Line& line, std::size_t at) {
    const auto isAside = [](const LineToken& token) {
        return token.kind == Kind::mark || token.kind == Kind::bracket ||
               token.kind == Kind::number || token.kind == Kind::letter ||
               token.kind == Kind::level || (token.text[0] >= '0' && token.text[0] <= '9');
    };
    while (at < line.size() && isAside(line[at])) {
        ++at;
    }
    return at < line.size() && line[at].kind == Kind::name;
}

/// The number of tokens up to a name that a dash follows, as in "com.example.Main - started"; that
/// many if there is none. Behind brackets any word is such a name.
std::size_t withSource(const Line& line, std::size_t count) {
    constexpr std::size_t furthest = 5;
    bool isBehindBrackets = false;
    for (std::size_t at = count; at + 2 < std::min(line.size(), count + furthest); ++at) {
        const bool isName =
            line[at].kind == Kind::path || (line[at].kind == Kind::word && isBehindBrackets);
        std::size_t end = at + 1;
        while (end + 1 < line.size() && line[end].mark == '-' && line[end].blanks == 0) {
            ++end;
        }
        if (isName && line[at].blanks > 0 && line[end].mark == '-' &&
            line[end].kind == Kind::mark && line[end].blanks > 0) {
            return end + 1;
        }
        isBehindBrackets = line[at].kind == Kind::bracket;
    }
    return count;
}

std::string symbols(const Line& line, std::size_t count) {
    std::string text;
    for (std::size_t at = 0; at < count; ++at) {
        text += line[at].symbol() + '\n';
    }
    return text;
}

class Grouping {
public:
    explicit Grouping(const std::vector<Line>& lines) {
        const Likeness least = hasLoneLevels(lines) ? Likeness::lone : Likeness::good;
        std::map<std::string, std::vector<const Line*>> certain;
        for (const Line& line : lines) {
            const std::size_t time = timeOf(line);
            const std::size_t level = levelOf(line, time, least);
            const std::size_t count =
                std::max(time < line.size() ? time + 1 : 0, level < line.size() ? level + 1 : 0);
            if (count > 0) {
                ++m_lines;
                m_named += isBeforeName(line, count) ? 1 : 0;
                certain[symbols(line, withSource(line, count))].push_back(&line);
            }
        }
        // What looks like a level in few lines is a word of the message.
        for (auto& [key, group] : certain) {
            const Line& first = *group.front();
            const std::size_t time = timeOf(first);
            const bool isRare = group.size() * 100 < lines.size() * leastPercent;
            const auto length = static_cast<std::size_t>(std::count(key.begin(), key.end(), '\n'));
            if (isRare && time < first.size() && length > time + 1) {
                auto& rest = m_groups[symbols(first, time + 1)];
                rest.length = rest.certain = time + 1;
                rest.lines.insert(rest.lines.end(), group.begin(), group.end());
            } else {
                auto& mine = m_groups[key];
                mine.length = mine.certain = length;
                mine.lines.insert(mine.lines.end(), group.begin(), group.end());
            }
        }
    }

    std::vector<LineHead> run() {
        std::vector<LineHead> open;
        for (auto& [key, head] : m_groups) {
            head.all = m_lines;
            open.push_back(std::move(head));
        }
        std::vector<LineHead> done;
        while (!open.empty()) {
            LineHead head = std::move(open.back());
            open.pop_back();
            extend(std::move(head), open, done);
        }
        return done;
    }

private:
    /// Splits the lines by their next token; those whose message begins there are done.
    void extend(LineHead head, std::vector<LineHead>& open, std::vector<LineHead>& done) const {
        std::map<std::string, LineHead> next;
        for (const Line* line : head.lines) {
            if (head.length >= line->size()) {
                next[""].lines.push_back(line);
                continue;
            }
            LineHead& one = next[(*line)[head.length].symbol()];
            one.length = head.length + 1;
            one.all = head.all;
            one.certain = head.certain;
            one.lines.push_back(line);
        }
        LineHead rest{{}, head.all, head.length, head.certain};
        for (auto& [symbol, one] : next) {
            if (!symbol.empty() && isColumn(one, head.lines.size()) && !endsLines(one)) {
                open.push_back(std::move(one));
            } else {
                rest.lines.insert(rest.lines.end(), one.lines.begin(), one.lines.end());
            }
        }
        if (!rest.lines.empty()) {
            done.push_back(std::move(rest));
        }
    }

    /// Whether the last token of these lines, out of `all`, is a column and not part of messages.
    bool isColumn(const LineHead& head, std::size_t all) const {
        const std::size_t at = head.length - 1;
        const LineToken& token = (*head.lines.front())[at];
        const auto isPart = [&](std::size_t percent) {
            return head.lines.size() * 100 >= all * percent;
        };
        constexpr std::size_t most = 65;
        constexpr std::size_t few = 15;
        if (token.isInside) {
            return true;
        }
        const bool isFirst = isBehindCertain(head);
        if (!isFirst && endsSource(head) && token.kind != Kind::mark) {
            return token.kind == Kind::bracket && token.mark == '[' && isPart(most);
        }
        switch (token.kind) {
        case Kind::mark:
            return std::string_view(":-=|,;/\t>])!.*~").find(token.mark) !=
                       std::string_view::npos &&
                   (isPart(most) || (at > 0 && (*head.lines.front())[at - 1].blanks == 0));
        case Kind::bracket:
            return isPart(isFirst && token.mark == '[' &&
                                  token.text.find(' ') == std::string_view::npos
                              ? few
                              : most);
        case Kind::word:
            return isPart(most) &&
                   (isPadded(head, at) || isRightAligned(head, at) || isBeforeBrackets(head, at));
        case Kind::name:
            return isPart(most) && m_named * 2 >= m_lines;
        case Kind::cell:
        case Kind::level:
        case Kind::letter:
        case Kind::severity:
        case Kind::number:
        case Kind::path:
            return isPart(isFirst && (isLoggerName(token.text) || isPlace(token.text)) ? few
                                                                                       : most);
        case Kind::pair:
        case Kind::quoted:
            return isPart(most);
        case Kind::time:
            break;
        }
        return false;
    }

    /// Whether there are but marks between the level and the last token.
    static bool isBehindCertain(const LineHead& head) {
        const Line& line = *head.lines.front();
        for (std::size_t at = head.certain; at + 1 < head.length; ++at) {
            if (line[at].kind != Kind::mark) {
                return false;
            }
        }
        return true;
    }

    /// Whether a name with its colon, or brackets behind them, is in front of the last token.
    static bool endsSource(const LineHead& head) {
        const Line& line = *head.lines.front();
        for (std::size_t at = head.certain; at + 1 < head.length; ++at) {
            if (line[at].kind == Kind::name && at + 2 < head.length && line[at + 1].mark == ':' &&
                !line[at].isInside) {
                return true;
            }
            const bool isTag = at > 1 && line[at - 1].mark == '/' && line[at - 1].blanks == 0 &&
                               line[at - 2].kind == Kind::letter && line[at].kind == Kind::path;
            if (isTag) {
                return true;
            }
        }
        return false;
    }

    /// Whether most lines have nothing behind the last token, which is their message then.
    static bool endsLines(const LineHead& head) {
        const auto ended = std::ranges::count_if(
            head.lines, [&](const Line* line) { return line->size() == head.length; });
        return (*head.lines.front())[head.length - 1].kind != Kind::mark &&
               static_cast<std::size_t>(ended) * 2 > head.lines.size();
    }

    /// Whether words are in front of brackets and a colon, as in "core [main.c:17]: text".
    static bool isBeforeBrackets(const LineHead& head, std::size_t at) {
        return std::ranges::all_of(head.lines, [at](const Line* line) {
            return at + 2 < line->size() && (*line)[at + 1].kind == Kind::bracket &&
                   (*line)[at + 2].kind == Kind::mark && (*line)[at + 2].mark == ':';
        });
    }

    /// Whether words of different lengths end at the same distance from what is in front of them.
    static bool isRightAligned(const LineHead& head, std::size_t at) {
        std::map<std::size_t, std::size_t> ends;
        std::set<std::size_t> sizes;
        std::size_t most = 0;
        for (const Line* line : head.lines) {
            const std::size_t size = (*line)[at].text.size();
            sizes.insert(size);
            most = std::max(most, ++ends[(at > 0 ? (*line)[at - 1].blanks : 0) + size]);
        }
        return sizes.size() > 1 && most * 10 >= head.lines.size() * 9;
    }

    /// Whether what is behind a word is as wide as columns need, or a mark.
    static bool isPadded(const LineHead& head, std::size_t at) {
        std::size_t wide = 0;
        std::size_t marked = 0;
        for (const Line* line : head.lines) {
            // Pairs are often lined up behind a message.
            const bool isBeforeText = at + 1 < line->size() && (*line)[at + 1].kind != Kind::pair;
            wide += (*line)[at].blanks > 1 && isBeforeText ? 1 : 0;
            constexpr std::string_view delimiters = "|\t;-,";
            marked += at + 1 < line->size() && (*line)[at + 1].kind == Kind::mark &&
                              delimiters.find((*line)[at + 1].mark) != std::string_view::npos
                          ? 1
                          : 0;
        }
        return wide * 10 >= head.lines.size() * 8 || marked * 10 >= head.lines.size() * 9;
    }

    std::map<std::string, LineHead> m_groups;
    std::size_t m_lines = 0; ///< with a time or a level
    std::size_t m_named = 0; ///< of these, those whose message would begin with a name
};

} // namespace

std::vector<LineHead> lineHeads(const std::vector<std::vector<LineToken>>& lines) {
    return Grouping(lines).run();
}

} // namespace zrm::host
