#include "host/diagnose/FormatProposal.h"

#include "host/diagnose/HeadColumns.h"
#include "host/diagnose/LineHeads.h"
#include "host/diagnose/LineTokens.h"
#include "host/formats/KeyValuePairs.h"
#include "host/formats/TimePattern.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <map>
#include <string_view>
#include <tuple>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::size_t mostLines = 1000;
constexpr std::size_t mostPatterns = 8;
constexpr std::size_t leastPercent = 2; ///< of the lines make a pattern of their own
constexpr std::size_t leastPairs = 30;  ///< percent of the lines

/// A pattern, and the lines that it was made from.
struct Shape {
    HeadColumns columns;
    std::size_t lines = 0;
};

/// Patterns with a level and those with more columns come first: others often fit the same lines.
bool isBefore(const Shape& one, const Shape& other) {
    const auto rank = [](const Shape& shape) {
        return std::tuple(shape.columns.hasType, shape.columns.length, shape.lines);
    };
    return rank(one) > rank(other);
}

/// How the times of some lines are read if their dates have an order.
struct Reading {
    std::size_t times = 0; ///< that can be read
    std::int64_t span = 0; ///< seconds between the earliest and the latest
};

Reading readingOf(const std::vector<std::string_view>& texts, const TimePattern& times) {
    Reading reading;
    std::int64_t first = std::numeric_limits<std::int64_t>::max();
    std::int64_t last = std::numeric_limits<std::int64_t>::min();
    for (const std::string_view text : texts) {
        EntryColumns columns;
        if (times.read(text, columns)) {
            ++reading.times;
            first = std::min(first, columns.time.seconds());
            last = std::max(last, columns.time.seconds());
        }
    }
    reading.span = reading.times == 0 ? 0 : last - first;
    return reading;
}

/// The order of dates such as 03/04/26 that reads most times, and of those that read as many the
/// one that puts them next to each other: the wrong one scatters the days of a month over a year.
/// Empty if the usual order does.
std::string dateOrder(const std::vector<std::vector<LineToken>>& lines) {
    std::vector<std::string_view> texts;
    for (const std::vector<LineToken>& line : lines) {
        const auto time = std::ranges::find(line, LineToken::Kind::time, &LineToken::kind);
        if (time != line.end()) {
            texts.push_back(time->text);
        }
    }
    std::string best;
    Reading most = readingOf(texts, *TimePattern::common());
    for (const char* order : {"day-first", "month-first", "year-first"}) {
        const auto times = TimePattern::compile(order);
        const Reading reading = times ? readingOf(texts, **times) : Reading{};
        if (std::pair(reading.times, most.span) > std::pair(most.times, reading.span)) {
            best = order;
            most = reading;
        }
    }
    return best;
}

bool hasPairs(const std::vector<std::string>& lines, std::size_t count) {
    std::size_t with = 0;
    for (std::size_t i = 0; i < count; ++i) {
        KeyValuePairs pairs(lines[i]);
        KeyValuePairs::Pair pair;
        with += pairs.next(pair) ? 1 : 0;
    }
    return with * 100 >= count * leastPairs;
}

/// The shapes that are worth a pattern. Behind them the beginnings of the others, up to the time
/// and the level, and that of the most frequent one: for lines that are not among these.
std::vector<Shape> chosen(const std::vector<LineHead>& heads, std::size_t lines) {
    std::map<std::string, Shape> shapes;
    std::map<std::string, Shape> beginnings;
    for (const LineHead& head : heads) {
        const HeadColumns columns = HeadColumns::of(head, head.length);
        const HeadColumns beginning = HeadColumns::of(head, head.certain);
        if (head.lines.size() * 100 >= lines * leastPercent) {
            Shape& shape = shapes.try_emplace(columns.pattern, Shape{columns, 0}).first->second;
            shape.lines += head.lines.size();
        }
        Shape& shape = beginnings.try_emplace(beginning.pattern, Shape{beginning, 0}).first->second;
        shape.lines += head.lines.size();
    }
    std::vector<Shape> kept;
    for (auto& [pattern, shape] : shapes) {
        beginnings.erase(pattern);
        kept.push_back(std::move(shape));
    }
    std::sort(kept.begin(), kept.end(),
              [](const Shape& one, const Shape& other) { return one.lines > other.lines; });
    kept.resize(std::min(kept.size(), mostPatterns - 2));
    std::vector<Shape> rest;
    for (auto& [pattern, shape] : beginnings) {
        rest.push_back(std::move(shape));
    }
    std::sort(rest.begin(), rest.end(),
              [](const Shape& one, const Shape& other) { return one.lines > other.lines; });
    rest.resize(std::min(rest.size(), std::size_t{2}));
    kept.insert(kept.end(), std::make_move_iterator(rest.begin()),
                std::make_move_iterator(rest.end()));
    std::stable_sort(kept.begin(), kept.end(), isBefore);
    return kept;
}

} // namespace

std::optional<FormatDescription> proposeFormat(const std::vector<std::string>& lines) {
    const auto times = TimePattern::common();
    const std::size_t count = std::min(lines.size(), mostLines);
    std::vector<std::vector<LineToken>> tokens;
    tokens.reserve(count);
    for (std::size_t i = 0; i < count; ++i) {
        tokens.push_back(lineTokens(lines[i], *times));
    }
    const std::vector<LineHead> heads = lineHeads(tokens);
    if (heads.empty()) {
        return std::nullopt;
    }
    std::size_t telling = 0;
    for (const LineHead& head : heads) {
        telling += head.lines.size();
    }
    FormatDescription format;
    format.type = "regex";
    format.pairs = hasPairs(lines, count);
    format.timeFormat = dateOrder(tokens);
    bool begin = true; // all with the time
    std::string starts;
    for (Shape& shape : chosen(heads, telling)) {
        begin = begin && !shape.columns.start.empty() &&
                (starts.empty() || shape.columns.start == starts);
        starts = shape.columns.start;
        format.values.insert(shape.columns.values.begin(), shape.columns.values.end());
        format.patterns.push_back(std::move(shape.columns.pattern));
    }
    if (begin && telling < count) {
        format.lines.starts = starts;
    }
    return format;
}

} // namespace zrm::host
