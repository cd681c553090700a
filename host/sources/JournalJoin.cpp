#include "host/sources/JournalJoin.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

namespace {

constexpr char separator = ' '; ///< in positions; cursors have none

std::uint64_t microseconds(std::chrono::milliseconds time) noexcept {
    return static_cast<std::uint64_t>(time.count()) * 1000;
}

} // namespace

std::string JournalJoin::cursorOf(const std::string& position) {
    return position.substr(0, position.find(separator));
}

void JournalJoin::begin(const std::string& position) {
    m_reached = cursorOf(position);
    m_consumed.clear();
    std::size_t at = m_reached.size();
    while (at < position.size()) {
        const std::size_t end = std::min(position.find(separator, at + 1), position.size());
        m_consumed.insert(position.substr(at + 1, end - at - 1));
        at = end;
    }
}

std::string JournalJoin::position() const {
    std::string position = m_reached;
    for (const Item& item : m_items) {
        if (isConsumed(item)) {
            position += separator;
            position += JournalLine::idOf(item.entry.first.cursor);
        }
    }
    for (const std::string& id : m_consumed) { // not read again so far
        position += separator + id;
    }
    return position;
}

/// Whether a line continues an entry.
bool JournalJoin::takes(const Item& item, const JournalLine& line) const {
    constexpr std::size_t lineEnds = 2; // both lines have one
    const LineJoin::Limits& limits = m_join.limits();
    return item.isOpen && !line.isCut && item.lines < limits.lines &&
           item.entry.text.size() + line.message.size() + lineEnds <= limits.bytes &&
           line.time <= item.lastTime + microseconds(limits.wait) &&
           m_join.joins(std::string_view(item.entry.text).substr(item.last), line.message);
}

void JournalJoin::append(Item& item, const JournalLine& line, Clock::time_point now) {
    std::string& text = item.entry.text;
    text.append(item.isOpen ? "\n" : "");
    item.last = text.size();
    text.append(line.message);
    item.lastTime = line.time;
    item.seen = now;
    item.isOpen = !line.isCut && m_join.isOpen(line.message);
}

void JournalJoin::push(Item item) {
    item.size = sizeof item + item.entry.first.size() + item.entry.text.size();
    m_bytes += item.size;
    m_items.push_back(std::move(item));
}

void JournalJoin::add(JournalLine line, Clock::time_point now) {
    m_latest = std::max(m_latest, line.time);
    const auto consumed = m_consumed.find(JournalLine::idOf(line.cursor));
    const auto open = m_open.find(line.writer);
    const bool wasConsumed = consumed != m_consumed.end();
    if (wasConsumed || (open != m_open.end() && takes(itemOf(open->second), line))) {
        Item further;
        further.isFirst = false;
        further.entry.first.cursor = std::move(line.cursor);
        if (wasConsumed) {
            m_consumed.erase(consumed);
        } else {
            Item& item = itemOf(open->second);
            append(item, line, now);
            ++item.lines;
            item.size += line.message.size();
            m_bytes += line.message.size();
            further.owner = open->second;
            if (!item.isOpen) {
                m_open.erase(open);
            }
        }
        push(std::move(further));
        return;
    }
    if (open != m_open.end()) {
        itemOf(open->second).isOpen = false;
        m_open.erase(open);
    }
    Item item;
    append(item, line, now);
    item.entry.first = std::move(line);
    if (item.isOpen) {
        m_open[item.entry.first.writer] = m_first + m_items.size();
    }
    push(std::move(item));
}

bool JournalJoin::isComplete(const Item& head, Clock::time_point now) const {
    const std::chrono::milliseconds wait = m_join.limits().wait;
    return !head.isOpen || now - head.seen >= wait ||
           m_latest > head.lastTime + microseconds(wait) || m_items.size() > mostLines ||
           m_bytes > mostBytes;
}

void JournalJoin::pop() {
    Item& head = m_items.front();
    m_reached = head.entry.first.cursor;
    m_bytes -= head.size;
    m_popped.push_back(std::move(head));
    m_items.pop_front();
    ++m_first;
}

const JournalEntry* JournalJoin::next(Clock::time_point now, bool isOver) {
    m_popped.clear();
    while (!m_items.empty() && isConsumed(m_items.front())) {
        pop();
    }
    m_popped.clear();
    if (m_items.empty() || (!isOver && !isComplete(m_items.front(), now))) {
        return nullptr;
    }
    m_reachedBefore = m_reached;
    m_givenBefore = std::exchange(m_given, m_first);
    if (m_items.front().isOpen) {
        m_open.erase(m_items.front().entry.first.writer);
        m_items.front().isOpen = false;
    }
    do {
        pop();
    } while (!m_items.empty() && isConsumed(m_items.front()));
    return &m_popped.front().entry;
}

void JournalJoin::takeBack() {
    if (m_popped.empty()) {
        return;
    }
    m_first -= m_popped.size();
    while (!m_popped.empty()) {
        m_items.push_front(std::move(m_popped.back()));
        m_popped.pop_back();
    }
    m_reached = m_reachedBefore;
    m_given = m_givenBefore;
}

std::chrono::milliseconds JournalJoin::patience(Clock::time_point now,
                                                std::chrono::milliseconds most) const {
    using std::chrono::milliseconds;
    if (m_items.empty()) {
        return most;
    }
    const auto left = m_items.front().seen + m_join.limits().wait - now;
    return std::clamp(std::chrono::ceil<milliseconds>(left), milliseconds(0), most);
}

} // namespace zrm::host
