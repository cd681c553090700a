#include "host/framework/Audience.h"

#include "host/framework/ColumnText.h"
#include "host/framework/RequestState.h"

#include <algorithm>
#include <bit>
#include <cstring>

namespace zrm::host {

namespace {

constexpr std::size_t wordSize = sizeof(std::uint64_t);

/// Logs come and go; the cache is cleared once it has this many.
constexpr std::size_t mostLogs = 8192;

/// A word whose first `length` bytes in memory are those of the text, and the rest 0.
std::uint64_t wordOf(std::string_view text, std::size_t length) noexcept {
    char bytes[wordSize] = {};
    std::memcpy(bytes, text.data(), length);
    return std::bit_cast<std::uint64_t>(bytes);
}

std::uint64_t maskOf(std::size_t length) noexcept {
    char bytes[wordSize] = {};
    std::memset(bytes, 0xff, length);
    return std::bit_cast<std::uint64_t>(bytes);
}

std::size_t slotOf(const char* row) noexcept {
    const auto address = reinterpret_cast<std::uintptr_t>(row);
    return (address >> 4 ^ address >> 12) % 256;
}

} // namespace

LinkedList& Audience::of(char* row, std::size_t rowSize) {
    if (m_requests.generation() != m_generation) {
        learnRequests(rowSize);
    }
    ++m_row;
    m_offered.store(m_offered.load(std::memory_order_relaxed) + 1, std::memory_order_relaxed);
    m_chosen.Clear();
    findMet(row);
    for (const std::uint32_t index : m_met) {
        ctreq* const request = m_members[index].request;
        request->framework().counts.countOffered();
        m_chosen.Add(request);
    }
    return m_chosen;
}

/// Finds the members whose prefix and checks the row meets, in list order.
void Audience::findMet(char* row) {
    m_met.clear();
    bool isSorted = true;
    for (const Group& group : groupsOf(row)) {
        std::uint64_t word;
        std::memcpy(&word, row + group.beginning.offset, sizeof word);
        if ((word & group.beginning.mask) != group.beginning.prefix) {
            continue;
        }
        isSorted = isSorted && m_met.empty();
        for (const std::uint32_t index : group.members) {
            if (meetsChecks(m_members[index], row)) {
                m_met.push_back(index);
            }
        }
    }
    if (!isSorted) {
        std::sort(m_met.begin(), m_met.end());
    }
}

bool Audience::meetsChecks(const Member& member, char* row) {
    const Check* const first = m_checks.data() + member.firstCheck;
    return std::all_of(first, first + member.checks, [&](const Check& check) {
        Text& text = m_texts[check.text];
        if (text.row != m_row) {
            text.row = m_row;
            text.text = ColumnText::unpadded(row + text.offset, text.width);
        }
        return check.condition->holdsFor(row, text.text);
    });
}

const Audience::Groups& Audience::groupsOf(char* row) {
    const Logs::value_type*& recent = m_recent[slotOf(row)];
    if (recent == nullptr || !isOf(row, recent->first)) {
        recent = &findLog(row);
    }
    return recent->second;
}

/// Whether the row belongs to the log.
bool Audience::isOf(const char* row, const std::string& log) const noexcept {
    const char* bytes = log.data();
    for (const Span& span : m_logColumns) {
        const std::size_t length = span.end - span.begin;
        if (std::memcmp(row + span.begin, bytes, length) != 0) {
            return false;
        }
        bytes += length;
    }
    return true;
}

const Audience::Logs::value_type& Audience::findLog(char* row) {
    std::string log;
    for (const Span& span : m_logColumns) {
        log.append(row + span.begin, span.end - span.begin);
    }
    if (const auto known = m_logs.find(log); known != m_logs.end()) {
        return *known;
    }
    if (m_logs.size() == mostLogs) {
        m_logs.clear();
        m_recent.fill(nullptr);
    }
    return *m_logs.emplace(std::move(log), groupsThatMean(row)).first;
}

/// The members whose conditions on the log hold for its rows.
Audience::Groups Audience::groupsThatMean(char* row) {
    Groups groups;
    const auto groupOf = [&groups](const Beginning& beginning) -> Group& {
        const auto found =
            std::find_if(groups.begin(), groups.end(),
                         [&beginning](const Group& group) { return group.beginning == beginning; });
        return found != groups.end() ? *found : groups.emplace_back(Group{beginning, {}});
    };
    auto condition = m_logConditions.begin();
    for (std::uint32_t index = 0; index < m_members.size(); ++index) {
        bool isMeant = true;
        for (; condition != m_logConditions.end() && condition->first == index; ++condition) {
            isMeant = isMeant && condition->second->holds(m_members[index].request, row);
        }
        if (isMeant) {
            groupOf(m_members[index].beginning).members.push_back(index);
        }
    }
    return groups;
}

void Audience::learnRequests(std::size_t rowSize) {
    m_generation = m_requests.generation();
    m_members.clear();
    m_checks.clear();
    m_texts.clear();
    m_logConditions.clear();
    m_logs.clear();
    m_recent.fill(nullptr);
    LinkedListIter requests(m_requests);
    while (void* const element = requests.Next()) {
        learnMember(*static_cast<ctreq*>(element), rowSize);
    }
    learnLogColumns();
    m_met.reserve(m_members.size());
}

void Audience::learnMember(ctreq& request, std::size_t rowSize) {
    request.framework().counts.joinAudience(m_offered);
    Member member;
    member.request = &request;
    member.firstCheck = static_cast<std::uint32_t>(m_checks.size());
    const auto index = static_cast<std::uint32_t>(m_members.size());
    for (const CompiledCondition& condition : request.framework().conditionsOf(request).all()) {
        if (condition.isOnLog() || condition.neverHolds()) {
            m_logConditions.emplace_back(index, &condition);
        } else if (condition.isOnText()) {
            addCheck(condition, member, rowSize);
        }
    }
    member.checks = static_cast<std::uint32_t>(m_checks.size()) - member.firstCheck;
    m_members.push_back(member);
}

void Audience::addCheck(const CompiledCondition& condition, Member& member, std::size_t rowSize) {
    const std::string_view prefix = condition.prefix();
    Beginning& beginning = member.beginning;
    if (beginning.mask == 0 && !prefix.empty() && condition.offset() + wordSize <= rowSize) {
        const std::size_t length = std::min({prefix.size(), wordSize, condition.width()});
        beginning = {maskOf(length), wordOf(prefix, length), condition.offset()};
    }
    m_checks.push_back({&condition, textOf(condition)});
}

std::size_t Audience::textOf(const CompiledCondition& condition) {
    const auto found = std::find_if(m_texts.begin(), m_texts.end(), [&](const Text& text) {
        return text.offset == condition.offset() && text.width == condition.width();
    });
    if (found != m_texts.end()) {
        return static_cast<std::size_t>(found - m_texts.begin());
    }
    m_texts.push_back({condition.offset(), condition.width(), m_row, {}});
    return m_texts.size() - 1;
}

void Audience::learnLogColumns() {
    std::vector<Span> columns;
    for (const auto& [member, condition] : m_logConditions) {
        if (!condition->neverHolds()) {
            columns.push_back({condition->offset(), condition->offset() + condition->width()});
        }
    }
    std::sort(columns.begin(), columns.end(),
              [](const Span& left, const Span& right) { return left.begin < right.begin; });
    m_logColumns.clear();
    for (const Span& column : columns) {
        if (!m_logColumns.empty() && column.begin <= m_logColumns.back().end) {
            m_logColumns.back().end = std::max(m_logColumns.back().end, column.end);
        } else {
            m_logColumns.push_back(column);
        }
    }
}

} // namespace zrm::host
