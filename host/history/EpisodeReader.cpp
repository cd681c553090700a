#include "host/history/EpisodeReader.h"

#include "host/history/Statement.h"

#include <algorithm>
#include <limits>

namespace zrm::host {

namespace {

constexpr auto largestId = static_cast<std::uint64_t>(std::numeric_limits<std::int64_t>::max());

/// The conditions of a query and the values of its parameters, in their order.
class Conditions {
public:
    explicit Conditions(const EpisodeFilter& filter) {
        if (filter.isOpen) {
            m_sql += *filter.isOpen ? " AND state = 'open'" : " AND state = 'resolved'";
        }
        if (filter.isAcknowledged) {
            m_sql += *filter.isAcknowledged ? " AND acknowledged IS NOT NULL"
                                            : " AND acknowledged IS NULL";
        }
        addNumbers(" AND id IN (", filter.ids);
        addAny(" AND situation IN (", filter.situations, ")");
        addAny(" AND (log IN (", filter.logs, ")");
        addAny(" OR EXISTS (SELECT 1 FROM episode_logs WHERE episode = id"
               " AND episode_logs.log IN (",
               filter.logs, ")))");
        for (const GroupValue& value : filter.group) {
            m_sql += " AND EXISTS (SELECT 1 FROM json_each(groups) WHERE key = ? AND atom = ?)";
            m_texts.push_back(value.name);
            m_texts.push_back(value.value);
        }
    }

    const std::string& sql() const noexcept { return m_sql; }
    int bind(Statement& statement) const {
        int parameter = 0;
        for (const std::string& text : m_texts) {
            statement.bind(++parameter, std::string_view(text));
        }
        return parameter;
    }

private:
    void addAny(const char* begin, const std::vector<std::string>& values, const char* end) {
        if (values.empty()) {
            return;
        }
        m_sql += begin;
        for (const std::string& value : values) {
            m_sql += m_sql.ends_with('(') ? "?" : ",?";
            m_texts.push_back(value);
        }
        m_sql += end;
    }

    void addNumbers(const char* begin, const std::vector<std::uint64_t>& values) {
        if (values.empty()) {
            return;
        }
        m_sql += begin;
        for (const std::uint64_t value : values) {
            m_sql += (m_sql.ends_with('(') ? "" : ",") + std::to_string(value);
        }
        m_sql += ')';
    }

    std::string m_sql = "state <> 'pause'";
    std::vector<std::string> m_texts;
};

/// What each log has added. Of an episode that lasts this is the whole.
void readShares(Statement& shares, EpisodeRecord& episode) {
    shares.bind(1, episode.id);
    while (shares.step()) {
        episode.shares.push_back({nullptr, std::string(shares.text(0)),
                                  static_cast<std::uint64_t>(shares.integer(1)), shares.integer(2),
                                  shares.integer(3)});
    }
    shares.reset();
    if (!episode.isOpen || episode.shares.empty()) {
        return;
    }
    episode.count = 0;
    for (const EpisodeShare& share : episode.shares) {
        episode.count += share.count;
        episode.first = std::min(episode.first, share.first);
        episode.last = std::max(episode.last, share.last);
    }
}

} // namespace

std::vector<EpisodeRecord> EpisodeReader::read(Database& database, const EpisodeFilter& filter) {
    const Conditions conditions(filter);
    Statement shares(database, "SELECT log, count, first, last FROM episode_logs"
                               " WHERE episode = ? ORDER BY log");
    Statement rows(database,
                   "SELECT id, state = 'open', situation, severity, log, groups, raised, count,"
                   " first, last, resolved, resolved_by, reason, acknowledged,"
                   " acknowledged_by, note FROM episodes WHERE " +
                       conditions.sql() + " AND id < ? ORDER BY id DESC LIMIT ?");
    const int parameters = conditions.bind(rows);
    rows.bind(parameters + 1, std::min(filter.before.value_or(largestId), largestId));
    rows.bind(parameters + 2, std::uint64_t{filter.limit});
    std::vector<EpisodeRecord> episodes;
    while (rows.step()) {
        EpisodeRecord& episode = episodes.emplace_back();
        episode.id = static_cast<std::uint64_t>(rows.integer(0));
        episode.isOpen = rows.integer(1) != 0;
        episode.situation = rows.text(2);
        episode.severity = rows.text(3);
        episode.log = rows.text(4);
        episode.groups = rows.text(5);
        episode.raised = rows.integer(6);
        episode.count = static_cast<std::uint64_t>(rows.integer(7));
        episode.first = rows.integer(8);
        episode.last = rows.integer(9);
        episode.resolved = rows.integer(10);
        episode.resolvedBy = static_cast<std::uint64_t>(rows.integer(11));
        episode.reason = rows.text(12);
        episode.acknowledged = {rows.integer(13), std::string(rows.text(14)),
                                std::string(rows.text(15))};
        readShares(shares, episode);
    }
    return episodes;
}

std::uint64_t EpisodeReader::countAcknowledged(Database& database) {
    // The first condition is that of the index.
    return static_cast<std::uint64_t>(
        database.number("SELECT count(acknowledged) FROM episodes WHERE state <> 'resolved'"
                        " AND state = 'open'"));
}

} // namespace zrm::host
