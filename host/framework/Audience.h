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

/// Finds the open situations that a new row may match, at a fraction of the cost of offering it to
/// each. It relies on two facts. The columns that name a log are the same in all rows of a log, so
/// conditions on them are evaluated once per log and kept until the list of situations changes. And
/// most other conditions fail on the first bytes of a column, which are compared once for all
/// situations of the log that expect the same bytes.
///
/// Only conditions on character columns are considered, since the table rewrites its integer
/// columns for each situation. A situation that is left out would have refused the row; it still
/// counts the row as judged. Used under the table manager's lock; allocates only when the list has
/// changed or a log is seen for the first time.
class Audience {
public:
    /// The list must outlive the object.
    explicit Audience(LinkedList& requests) : m_requests(requests) {}
    Audience(const Audience&) = delete;
    Audience& operator=(const Audience&) = delete;

    /// The situations that the row of `rowSize` bytes may match, in list order. Valid until the
    /// next call.
    LinkedList& of(char* row, std::size_t rowSize);

private:
    /// A condition to check when the first bytes are not decisive.
    struct Check {
        const CompiledCondition* condition;
        std::size_t text; ///< index of its column in m_texts
    };
    /// What situations require of a row before anything else is checked: the eight bytes at the
    /// offset, masked, must equal the prefix.
    struct Beginning {
        std::uint64_t mask = 0;
        std::uint64_t prefix = 0;
        std::size_t offset = 0;
        bool operator==(const Beginning&) const = default;
    };
    /// An open situation. If its prefix does not match, neither do its conditions.
    struct Member {
        Beginning beginning;
        std::uint32_t firstCheck = 0; ///< in m_checks
        std::uint32_t checks = 0;
        ctreq* request = nullptr;
    };
    /// The text of a character column, determined once per row for all situations.
    struct Text {
        std::size_t offset;
        std::size_t width;
        std::uint64_t row; ///< number of the row that the text belongs to, as counted by m_row
        std::string_view text;
    };
    /// Some bytes of a row.
    struct Span {
        std::size_t begin;
        std::size_t end;
    };
    /// Situations of a log that share a prefix, in list order.
    struct Group {
        Beginning beginning;
        std::vector<std::uint32_t> members; ///< indexes of m_members
    };
    using Groups = std::vector<Group>; ///< the groups of a log, one per prefix
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
    std::vector<std::uint32_t> m_met; ///< members that the row may match
    std::uint64_t m_generation = 0;   ///< of the list when it was last read; 0: never
    std::vector<Member> m_members;
    std::vector<Check> m_checks;
    std::vector<Text> m_texts;
    /// Conditions on the columns that name a log, each with its member.
    std::vector<std::pair<std::uint32_t, const CompiledCondition*>> m_logConditions;
    std::vector<Span> m_logColumns; ///< columns used in conditions
    Logs m_logs;                    ///< by the bytes of these columns
    /// The log whose row was last seen at an address: each log offers its rows at one address.
    std::array<const Logs::value_type*, 256> m_recent{};
    std::uint64_t m_row = 0; ///< rows seen
    std::atomic<std::uint64_t> m_offered{0};
};

} // namespace zrm::host

#endif
