#include "host/diagnose/HeadColumns.h"

#include "host/diagnose/LineWords.h"

#include <algorithm>
#include <array>
#include <optional>
#include <set>
#include <string_view>
#include <vector>

namespace zrm::host {

namespace {

using Kind = LineToken::Kind;

constexpr std::size_t none = static_cast<std::size_t>(-1);

constexpr std::array<std::pair<char, const char*>, 9> letterNames = {{{'D', "DEBUG"},
                                                                      {'I', "INFO"},
                                                                      {'N', "NOTICE"},
                                                                      {'W', "WARNING"},
                                                                      {'E', "ERROR"},
                                                                      {'F', "FATAL"},
                                                                      {'C', "CRITICAL"},
                                                                      {'T', "TRACE"},
                                                                      {'V', "VERBOSE"}}};

constexpr std::array<const char*, 8> severityNames = {"EMERGENCY", "ALERT",  "CRITICAL", "ERROR",
                                                      "WARNING",   "NOTICE", "INFO",     "DEBUG"};

class Columns {
public:
    Columns(const LineHead& head, std::size_t length) : m_head(head), m_length(length) {
        m_time = first(Kind::time);
        m_type = typeOf();
        m_source = sourceOf();
        trim();
    }

    HeadColumns result() {
        HeadColumns columns;
        std::string text = "^";
        for (std::size_t at = 0; at < m_length; ++at) {
            text += separator(at) + expression(at);
            if (at == m_time && at < 2) {
                columns.start = text;
            }
        }
        const bool isEnd = m_length > 0 && hasBlanks(m_length - 1);
        // The capture of the time is of no use where entries begin.
        for (const std::string_view name : {"?P<time>", "?P<type>"}) {
            if (const std::size_t at = columns.start.find(name); at != std::string::npos) {
                columns.start.replace(at, name.size(), "?:");
            }
        }
        columns.pattern = text + (isEnd ? R"(\s+)" : R"(\s*)") + R"((?P<description>[^\n]*))";
        columns.length = m_length;
        columns.hasType = m_type != none && m_type < m_length;
        if (m_type != none && token(m_type).kind == Kind::letter) {
            for (const auto& [letter, name] : letterNames) {
                columns.values["type"][std::string(1, letter)] = name;
            }
        }
        if (m_type != none && token(m_type).kind == Kind::severity) {
            for (std::size_t at = 0; at < severityNames.size(); ++at) {
                columns.values["type"][std::to_string(at)] = severityNames[at];
            }
        }
        return columns;
    }

private:
    const LineToken& token(std::size_t at) const { return (*m_head.lines.front())[at]; }

    std::size_t first(Kind kind) const {
        for (std::size_t at = 0; at < m_length; ++at) {
            if (token(at).kind == kind) {
                return at;
            }
        }
        return none;
    }

    /// A level that is not the first word of a name.
    std::size_t typeOf() const {
        const bool isCertain = m_head.certain > 0 && m_head.certain - 1 < m_length;
        if (isCertain) {
            const Kind kind = token(m_head.certain - 1).kind;
            if (kind == Kind::level || kind == Kind::letter || kind == Kind::severity) {
                return m_head.certain - 1;
            }
        }
        for (const Kind kind : {Kind::severity, Kind::level, Kind::letter}) {
            if (const std::size_t at = first(kind); at != none) {
                return at;
            }
        }
        return none;
    }

    template <class Of> bool isForMost(std::size_t at, Of of) const {
        std::size_t count = 0;
        std::size_t empty = 0;
        for (const auto* line : m_head.lines) {
            const std::string_view text = (*line)[at].text;
            const bool isEmpty = text.empty() || text == "-";
            empty += isEmpty ? 1 : 0;
            count += !isEmpty && of(text) ? 1 : 0;
        }
        const std::size_t filled = m_head.lines.size() - empty;
        return filled == 0 || count * 2 > filled;
    }

    /// How much a column looks like the name of who speaks.
    int sourceRank(std::size_t at) const {
        constexpr int thread = 50;
        int rank = 0;
        switch (token(at).kind) {
        case Kind::name:
            rank = 40;
            break;
        case Kind::path:
            rank = 45;
            break;
        case Kind::bracket:
            rank = token(at).mark == '(' || token(at).mark == '{' ? 25 : 30;
            break;
        case Kind::cell:
            rank = 25;
            break;
        case Kind::word:
            rank = 20;
            break;
        default:
            return 0;
        }
        const auto isMute = [](std::string_view text) {
            return std::ranges::none_of(text, [](char c) {
                return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
                       static_cast<unsigned char>(c) > 0x7f;
            });
        };
        constexpr int place = 45;
        if (isForMost(at, isPlace)) {
            rank = std::max(rank - place, 1);
        } else if (isForMost(at, isThread) || isForMost(at, isMute)) {
            rank -= thread;
        }
        rank += isForMost(at,
                          [](std::string_view text) {
                              return text.find_first_of("./") != std::string_view::npos ||
                                     text.find("::") != std::string_view::npos;
                          })
                    ? 10
                    : 0;
        rank += at >= m_head.certain ? 5 : 0;
        rank += isBeforeProcess(at) ? 20 : 0;
        const bool isBeforeDash = at + 1 < m_length && token(at + 1).mark == '-' &&
                                  token(at + 1).kind == Kind::mark && hasBlanks(at);
        rank += isBeforeDash ? 20 : 0;
        rank -=
            isForMost(
                at, [](std::string_view text) { return text.find(' ') != std::string_view::npos; })
                ? 30
                : 0;
        return rank;
    }

    /// "pacemakerd [1234]"
    bool isBeforeProcess(std::size_t at) const {
        return at + 1 < m_length && token(at).kind == Kind::word &&
               token(at + 1).kind == Kind::bracket && isForMost(at + 1, isNumber);
    }

    std::size_t sourceOf() const {
        std::size_t best = none;
        int rank = 0;
        for (std::size_t at = 0; at < m_length; ++at) {
            if (at == m_time || at == m_type) {
                continue;
            }
            if (const int mine = sourceRank(at); mine > 0 && mine >= rank) {
                rank = mine;
                best = at;
            }
        }
        return best;
    }

    /// Numbers, quoted texts and pairs in front of a message are part of it.
    void trim() {
        constexpr std::string_view delimiters = "|\t;";
        const auto isPart = [this, delimiters](std::size_t at) {
            const bool isCell = at + 1 < m_length && token(at + 1).kind == Kind::mark &&
                                delimiters.find(token(at + 1).mark) != std::string_view::npos;
            if (isCell || token(at).isInside) {
                return false;
            }
            const Kind kind = token(at).kind;
            const bool isKept = at == m_time || at == m_type || at == m_source;
            return !isKept && (kind == Kind::number || kind == Kind::quoted || kind == Kind::pair ||
                               kind == Kind::word || kind == Kind::path || kind == Kind::name ||
                               kind == Kind::level || kind == Kind::letter);
        };
        for (std::size_t at = m_length; at > m_head.certain; --at) {
            if (isPart(at - 1)) {
                m_length = at - 1;
            } else if (token(at - 1).kind != Kind::mark || at < 2 || !isPart(at - 2)) {
                break;
            }
        }
    }

    bool hasBlanks(std::size_t at) const {
        return std::ranges::all_of(m_head.lines,
                                   [at](const auto* line) { return (*line)[at].blanks > 0; });
    }

    std::string separator(std::size_t at) const {
        if (at == 0) {
            return R"(\s*)";
        }
        const bool isTight = std::ranges::all_of(
            m_head.lines, [at](const auto* line) { return (*line)[at - 1].blanks == 0; });
        return isTight ? "" : hasBlanks(at - 1) ? R"(\s+)" : R"(\s*)";
    }

    std::string name(std::size_t at) {
        if (at == m_time) {
            return "time";
        }
        if (at == m_type) {
            return "type";
        }
        if (at == m_source) {
            return "source";
        }
        return (token(at).kind == Kind::number ? "number" : "part") + std::to_string(++m_fields);
    }

    bool contains(std::size_t at, char c) const {
        return std::ranges::any_of(m_head.lines, [at, c](const auto* line) {
            return (*line)[at].text.find(c) != std::string_view::npos;
        });
    }

    std::string captured(std::size_t at, const std::string& inner) {
        return "(?P<" + name(at) + '>' + inner + ')';
    }

    std::string expression(std::size_t at) {
        const LineToken& one = token(at);
        switch (one.kind) {
        case Kind::mark:
            return literalExpression(one.mark);
        case Kind::time:
            return captured(at, timeExpression(one.text));
        case Kind::level:
            return captured(at, levelExpression(at));
        case Kind::letter:
            return captured(at, "[A-Z]");
        case Kind::severity:
            return captured(at, "[0-7]");
        case Kind::number:
            return captured(at, R"(\d+)");
        case Kind::pair:
            return pairExpression(one);
        case Kind::quoted:
            return '"' + captured(at, "[^\"]*") + '"';
        case Kind::bracket: {
            const char close = one.mark == '['   ? ']'
                               : one.mark == '(' ? ')'
                               : one.mark == '{' ? '}'
                                                 : '>';
            const std::string inner =
                contains(at, close) ? ".*?" : "[^" + literalExpression(close) + "]*?";
            return literalExpression(one.mark) + R"(\s*)" + captured(at, inner) + R"(\s*)" +
                   literalExpression(close);
        }
        case Kind::cell:
            return captured(at, ".*?");
        case Kind::name:
        case Kind::path:
        case Kind::word:
            break;
        }
        const bool isMarked = at + 1 < m_length && token(at + 1).kind == Kind::mark;
        if (isMarked && !contains(at, token(at + 1).mark)) {
            return captured(at, R"([^\s)" + literalExpression(token(at + 1).mark) + "]+");
        }
        return captured(at, isMarked ? R"(\S+?)" : R"(\S+)");
    }

    /// Where nothing else shows that a word is a level, it is one of the usual ones, or of these.
    std::string levelExpression(std::size_t at) const {
        const bool isEnclosed = at > 0 && at + 1 < m_length && token(at - 1).kind == Kind::mark &&
                                token(at + 1).kind == Kind::mark && token(at - 1).mark != ':';
        if (isEnclosed && m_head.lines.size() * 2 >= m_head.all) {
            return "[A-Za-z]+";
        }
        // "DETAIL:" where most lines have "INFO:" is one, too.
        const bool isMarked = at + 1 < m_length && token(at + 1).kind == Kind::mark &&
                              token(at + 1).blanks > 0 && token(at + 1).mark == ':';
        const bool isUpper = isForMost(at, [](std::string_view text) {
            return std::ranges::all_of(text, [](char c) { return c >= 'A' && c <= 'Z'; });
        });
        if (isMarked && isUpper && m_head.lines.size() * 2 >= m_head.all) {
            return "[A-Z]+";
        }
        std::set<std::string> names;
        for (const auto* line : m_head.lines) {
            names.emplace((*line)[at].text);
        }
        const std::string first(token(at).text);
        const bool isLower = first.back() >= 'a' && first.back() <= 'z';
        const bool isCapital = isLower && first.front() >= 'A' && first.front() <= 'Z';
        for (const char* usual : {"trace", "debug", "info", "notice", "warn", "warning", "error",
                                  "critical", "fatal", "alert", "emerg", "severe"}) {
            std::string name = usual;
            for (char& c : name) {
                const bool isUpper = !isLower || (isCapital && &c == name.data());
                c = static_cast<char>(isUpper ? c - 'a' + 'A' : c);
            }
            names.insert(std::move(name));
        }
        std::vector<std::string> sorted(names.rbegin(), names.rend()); // WARNING before WARN
        std::string expression;
        for (const std::string& name : sorted) {
            expression += (expression.empty() ? "" : "|") + name;
        }
        return expression;
    }

    std::string pairExpression(const LineToken& one) {
        const std::string key(one.text.substr(0, one.text.find('=')));
        std::string literal;
        std::string field;
        for (const char c : key) {
            literal += literalExpression(c);
            const bool isName = c == '_' || (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') ||
                                (c >= 'A' && c <= 'Z');
            field += isName ? c : '_';
        }
        constexpr std::array<std::string_view, 6> columns = {"time", "system", "source",
                                                             "type", "class",  "description"};
        const bool isFree =
            std::ranges::find(columns, field) == columns.end() && m_names.insert(field).second;
        field = isFree ? field : "part" + std::to_string(++m_fields);
        return literal + "=(?P<" + field + R"(>"[^"]*"|[^\s,;]*))";
    }

    const LineHead& m_head;
    std::size_t m_length;
    std::size_t m_time = none;
    std::size_t m_type = none;
    std::size_t m_source = none;
    std::size_t m_fields = 0;
    std::set<std::string> m_names;
};

} // namespace

HeadColumns HeadColumns::of(const LineHead& head, std::size_t length) {
    return Columns(head, length).result();
}

} // namespace zrm::host
