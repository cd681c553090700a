#include "host/sources/JournalJoinBack.h"

#include "host/sources/JournalJoin.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

namespace {

std::uint64_t later(std::uint64_t time, std::chrono::milliseconds wait) noexcept {
    return time + static_cast<std::uint64_t>(wait.count()) * 1000;
}

} // namespace

bool JournalJoinBack::continues(const JournalLine& older, const JournalLine& line) const {
    return !older.isCut && !line.isCut && line.time <= later(older.time, m_join.limits().wait) &&
           m_join.isOpen(older.message) && m_join.joins(older.message, line.message);
}

void JournalJoinBack::add(JournalLine line) {
    m_oldest = std::min(m_oldest, line.time);
    m_bytes += line.size();
    const std::uint64_t number = m_first + m_items.size();
    const auto [known, isNew] = m_unknown.try_emplace(line.writer, number);
    if (!isNew) {
        Item& younger = m_items[std::exchange(known->second, number) - m_first];
        younger.kind = continues(line, younger.line) ? Kind::further : Kind::first;
    }
    m_items.push_back({std::move(line), Kind::unknown});
}

bool JournalJoinBack::isDecided(const Item& head, bool isOver) const {
    return isOver || head.kind != Kind::unknown ||
           head.line.time > later(m_oldest, m_join.limits().wait) ||
           m_items.size() > JournalJoin::mostLines || m_bytes > JournalJoin::mostBytes;
}

/// Takes the newest line, which is decided.
void JournalJoinBack::take() {
    Item head = std::move(m_items.front());
    m_items.pop_front();
    ++m_first;
    if (head.kind == Kind::unknown) {
        m_unknown.erase(head.line.writer);
    }
    if (head.kind == Kind::further) {
        std::vector<JournalLine>& lines = m_further[head.line.writer];
        lines.push_back(std::move(head.line));
    } else {
        makeEntries(std::move(head.line));
    }
}

/// The entry that begins with a line; several where it has more than an entry may have.
void JournalJoinBack::makeEntries(JournalLine first) {
    const LineJoin::Limits& limits = m_join.limits();
    std::vector<JournalLine> further;
    if (const auto found = m_further.find(first.writer); found != m_further.end()) {
        further = std::move(found->second);
        m_further.erase(found);
    }
    std::size_t lines = 1;
    m_bytes -= first.size();
    m_ready.push_back({std::move(first), ""});
    m_ready.back().text = m_ready.back().first.message;
    for (auto line = further.rbegin(); line != further.rend(); ++line) {
        m_bytes -= line->size();
        std::string& text = m_ready.back().text;
        if (lines < limits.lines && text.size() + line->message.size() + 2 <= limits.bytes) {
            text.append("\n").append(line->message);
            ++lines;
        } else {
            m_ready.push_back({std::move(*line), ""});
            m_ready.back().text = m_ready.back().first.message;
            lines = 1;
        }
    }
}

const JournalEntry* JournalJoinBack::previous(bool isOver) {
    while (m_ready.empty() && !m_items.empty() && isDecided(m_items.front(), isOver)) {
        take();
    }
    if (m_ready.empty()) {
        return nullptr;
    }
    m_given = std::move(m_ready.back());
    m_ready.pop_back();
    return &m_given;
}

std::set<std::string, std::less<>> JournalJoinBack::waiting() const {
    std::set<std::string, std::less<>> ids;
    for (const auto& [writer, lines] : m_further) {
        for (const JournalLine& line : lines) {
            ids.emplace(JournalLine::idOf(line.cursor));
        }
    }
    return ids;
}

} // namespace zrm::host
