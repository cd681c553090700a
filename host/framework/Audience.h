#ifndef ZRM_HOST_AUDIENCE_H
#define ZRM_HOST_AUDIENCE_H

#include "framework/LinkedList.h"

#include <array>
#include <atomic>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

class ctreq;

namespace zrm::host {

class CompiledCondition;

/// Finds the open situations that a fresh row may concern, at a small part of what it costs to
/// offer it to each. Two things are used. The columns that name a log are the same in all rows of
/// a log, so what the conditions on them say is found once per log and kept until the list of
/// situations changes. And most other conditions are refused by the first bytes of a column, which
/// are compared here once for all situations of the log that want the same bytes there.
///
/// Only conditions on character columns are looked at, since the table writes its integer columns
/// for each situation anew. A situation that is left out would have refused the row; it counts the
/// row as judged all the same. Used under the table manager's lock; allocates when the list has
/// changed and when a log is seen for the first time, else not.
class Audience {
public:
    /// The list outlives the object.
    explicit Audience(LinkedList& requests) : m_requests(requests) {}
    Audience(const Audience&) = delete;
    Audience& operator=(const Audience&) = delete;

    /// The situations that the row of `rowSize` bytes may concern, in their order in the list.
    /// Valid until the next call.
    LinkedList& of(char* row, std::size_t rowSize);

private:
    /// A condition that decides when the first bytes do not.
    struct Check {
        const CompiledCondition* condition;
        std::size_t text; ///< index of its column in m_texts
    };
    /// What situations want of a row before it is worth looking at more: that the eight bytes at
    /// the offset, masked, are those of the prefix.
    struct Beginning {
        std::uint64_t mask = 0;
        std::uint64_t prefix = 0;
        std::size_t offset = 0;
        bool operator==(const Beginning&) const = default;
    };
    /// An open situation. It does not meet its conditions where its beginning is not met.
    struct Member {
        Beginning beginning;
        std::uint32_t firstCheck = 0; ///< in m_checks
        std::uint32_t checks = 0;
        ctreq* request = nullptr;
    };
    /// The text of a character column, found once per row whichever situations look at it.
    struct Text {
        std::size_t offset;
        std::size_t width;
        std::uint64_t row; ///< the row whose text is held, as m_row counts
        std::string_view text;
    };
    /// Some bytes of a row.
    struct Span {
        std::size_t begin;
        std::size_t end;
    };
    /// Situations of a log that share a beginning, in their order.
    struct Group {
        Beginning beginning;
        std::vector<std::uint32_t> members; ///< indexes of m_members
    };
    using Groups = std::vector<Group>; ///< those of a log, of different beginnings
    using Logs = std::unordered_map<std::string, Groups>;

    void learnRequests(std::size_t rowSize);
    void learnMember(ctreq& request, std::size_t rowSize);
    void addCheck(const CompiledCondition& condition, Member& member, std::size_t rowSize);
    std::size_t textOf(const CompiledCondition& condition);
    void learnLogColumns();
    const Groups& groupsOf(char* row);
    void findMet(char* row);
    Groups groupsThatMean(char* row);
    bool isOf(const char* row, const std::string& log) const noexcept;
    const Logs::value_type& findLog(char* row);
    bool meetsChecks(const Member& member, char* row);

    LinkedList& m_requests;
    LinkedList m_chosen;
    std::vector<std::uint32_t> m_met; ///< members that the row may concern
    std::uint64_t m_generation = 0;   ///< of the list when it was learnt; 0: never
    std::vector<Member> m_members;
    std::vector<Check> m_checks;
    std::vector<Text> m_texts;
    /// Conditions on the columns that name a log, with the member that states each.
    std::vector<std::pair<std::uint32_t, const CompiledCondition*>> m_logConditions;
    std::vector<Span> m_logColumns; ///< those that conditions are on
    Logs m_logs;                    ///< by the bytes of these columns
    /// The log whose row was seen at an address last: each log offers its rows at one address.
    std::array<const Logs::value_type*, 256> m_recent{};
    std::uint64_t m_row = 0; ///< rows seen
    std::atomic<std::uint64_t> m_offered{0};
};

} // namespace zrm::host

#endif
