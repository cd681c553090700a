#include "host/diagnose/LineHeads.h"

#include "host/diagnose/LineWords.h"

#include <algorithm>
#include <map>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

using Kind = LineToken::Kind;
using Line = std::vector<LineToken>;

constexpr std::size_t furthestTime = 16;  ///< tokens
constexpr std::size_t furthestLevel = 12; ///< tokens behind the time, or behind the beginning
constexpr std::size_t leastPercent = 4;   ///< of the lines must have their level at one place

bool isEnclosed(const Line& line, std::size_t at) {
    return at > 0 && at + 1 < line.size() && line[at - 1].kind == Kind::mark &&
           line[at + 1].kind == Kind::mark;
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

/// Whether the word looks like a level and not like a word of the message.
bool isLevel(const Line& line, std::size_t at, std::size_t time) {
    const LineToken& token = line[at];
    const bool isNext = at == 0 || line[at - 1].kind == Kind::mark || at == time + 1;
    const bool isMarked = at + 1 < line.size() && line[at + 1].kind == Kind::mark;
    if (token.kind == Kind::level) {
        return isUpper(token.text) || isEnclosed(line, at) || (isNext && token.blanks > 1) ||
               (isClearLevelName(token.text) && (isNext || isMarked));
    }
    return token.kind == Kind::letter &&
           (isEnclosed(line, at) || (isNext && at + 1 < line.size()) || at + 1 == time);
}

/// The place of the level; the number of tokens if there is none.
std::size_t levelOf(const Line& line, std::size_t time) {
    const std::size_t from = time == line.size() ? 0 : time;
    const std::size_t most = std::min(line.size(), from + furthestLevel);
    for (const Kind kind : {Kind::level, Kind::letter}) {
        for (std::size_t at = 0; at < most; ++at) {
            if (line[at].kind == kind && isLevel(line, at, time)) {
                return at;
            }
        }
    }
    return line.size();
}

/// The number of tokens up to a name that a dash follows, as in "com.example.Main - started"; that
/// many if there is none. Behind brackets any word is such a name.
std::size_t withSource(const Line& line, std::size_t count) {
    constexpr std::size_t furthest = 5;
    bool isBehindBrackets = false;
    for (std::size_t at = count; at + 2 < std::min(line.size(), count + furthest); ++at) {
        const bool isName =
            line[at].kind == Kind::path || (line[at].kind == Kind::word && isBehindBrackets);
        if (isName && line[at].blanks > 0 && line[at + 1].mark == '-' &&
            line[at + 1].kind == Kind::mark && line[at + 1].blanks > 0) {
            return at + 2;
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
        std::map<std::string, std::vector<const Line*>> certain;
        for (const Line& line : lines) {
            const std::size_t time = timeOf(line);
            const std::size_t level = levelOf(line, time);
            const std::size_t count =
                std::max(time < line.size() ? time + 1 : 0, level < line.size() ? level + 1 : 0);
            if (count > 0) {
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
    static void extend(LineHead head, std::vector<LineHead>& open, std::vector<LineHead>& done) {
        std::map<std::string, LineHead> next;
        for (const Line* line : head.lines) {
            if (head.length >= line->size()) {
                next[""].lines.push_back(line);
                continue;
            }
            LineHead& one = next[(*line)[head.length].symbol()];
            one.length = head.length + 1;
            one.certain = head.certain;
            one.lines.push_back(line);
        }
        LineHead rest{{}, head.length, head.certain};
        for (auto& [symbol, one] : next) {
            if (!symbol.empty() && isColumn(one, head.lines.size())) {
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
    static bool isColumn(const LineHead& head, std::size_t all) {
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
            return std::string_view(":-=|,;/\t>])!.").find(token.mark) != std::string_view::npos &&
                   (isPart(most) || (at > 0 && (*head.lines.front())[at - 1].blanks == 0));
        case Kind::bracket:
            return isPart(isFirst && token.mark == '[' &&
                                  token.text.find(' ') == std::string_view::npos
                              ? few
                              : most);
        case Kind::word:
            return isPart(most) && isPadded(head, at);
        case Kind::cell:
        case Kind::level:
        case Kind::letter:
        case Kind::number:
        case Kind::name:
        case Kind::path:
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
        for (std::size_t at = head.certain; at + 2 < head.length; ++at) {
            if (line[at].kind == Kind::name && line[at + 1].mark == ':' && !line[at].isInside) {
                return true;
            }
        }
        return false;
    }

    /// Whether what is behind a word is as wide as columns need, or a mark.
    static bool isPadded(const LineHead& head, std::size_t at) {
        std::size_t wide = 0;
        std::size_t marked = 0;
        for (const Line* line : head.lines) {
            // Pairs are often lined up behind a message.
            const bool isBeforeText = at + 1 < line->size() && (*line)[at + 1].kind != Kind::pair;
            wide += (*line)[at].blanks > 1 && isBeforeText ? 1 : 0;
            constexpr std::string_view delimiters = "|\t;-";
            marked += at + 1 < line->size() && (*line)[at + 1].kind == Kind::mark &&
                              delimiters.find((*line)[at + 1].mark) != std::string_view::npos
                          ? 1
                          : 0;
        }
        return wide * 10 >= head.lines.size() * 8 || marked * 10 >= head.lines.size() * 9;
    }

    std::map<std::string, LineHead> m_groups;
};

} // namespace

std::vector<LineHead> lineHeads(const std::vector<std::vector<LineToken>>& lines) {
    return Grouping(lines).run();
}

} // namespace zrm::host
