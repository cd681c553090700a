#include "host/history/EpisodeTable.h"

#include "host/base/JsonWriter.h"

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

std::string valuesText(const std::vector<GroupValue>& values) {
    return JsonWriter::text([&](JsonWriter& json) {
        json.beginObject();
        for (const GroupValue& value : values) {
            json.member(value.name, value.value);
        }
        json.endObject();
    });
}

std::vector<GroupValue> valuesOf(std::string_view text) {
    std::vector<GroupValue> values;
    const auto json = nlohmann::ordered_json::parse(text, nullptr, false);
    if (json.is_object()) {
        for (const auto& [name, value] : json.items()) {
            if (value.is_string()) {
                values.push_back({name, value.get<std::string>()});
            }
        }
    }
    return values;
}

const char* stateOf(EventJudgement::State state) {
    switch (state) {
    case EventJudgement::RAISED:
        return "open";
    case EventJudgement::RESOLVED:
        return "resolved";
    default:
        return "pause";
    }
}

} // namespace

EpisodeTable::EpisodeTable(Database& database)
    : m_begin(database, "INSERT OR REPLACE INTO episodes (id, state, situation, severity,"
                        " definition, log, node, groups, raised, count, first, last,"
                        " text_values) VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?, ?)"),
      m_end(database, "UPDATE episodes SET state = 'resolved', resolved = ?, resolved_by = ?,"
                      " reason = ?, count = ?, first = ?, last = ? WHERE id = ?"),
      m_endPause(database, "DELETE FROM episodes WHERE state = 'pause' AND situation = ?"
                           " AND groups = ?"),
      m_share(database, "INSERT OR REPLACE INTO episode_logs (episode, log, count, first, last)"
                        " VALUES (?, ?, ?, ?, ?)"),
      m_acknowledge(database, "UPDATE episodes SET acknowledged = ?, acknowledged_by = ?, note = ?"
                              " WHERE id = ? AND state = 'open' AND acknowledged IS NULL"
                              " RETURNING id"),
      m_withdraw(database, "UPDATE episodes SET acknowledged = NULL, acknowledged_by = '',"
                           " note = '' WHERE id = ? AND state = 'open'"
                           " AND acknowledged IS NOT NULL RETURNING id"),
      m_find(database, "SELECT state = 'open', acknowledged IS NOT NULL FROM episodes"
                       " WHERE id = ? AND state <> 'pause'"),
      m_remove(database, "DELETE FROM episodes WHERE id <= ? AND state <> 'open'"),
      m_removeShares(database, "DELETE FROM episode_logs WHERE episode <= ? AND NOT EXISTS"
                               " (SELECT 1 FROM episodes WHERE id = episode)") {}

void EpisodeTable::keep(const EpisodeChange& change) {
    const EventJudgement& judgement = *change.judgement;
    if (judgement.state == EventJudgement::SINGLE) {
        return;
    }
    if (judgement.state == EventJudgement::RESOLVED) {
        m_end.bind(1, change.raised).bind(2, change.event);
        m_end.bind(3, std::string_view(judgement.reason)).bind(4, judgement.count);
        m_end.bind(5, judgement.first).bind(6, judgement.last);
        m_end.bind(7, judgement.episode->value()).run();
        return;
    }
    const std::string group = valuesText(judgement.group);
    if (judgement.state == EventJudgement::PAUSED) {
        m_endPause.bind(1, std::string_view(change.situation->name));
        m_endPause.bind(2, std::string_view(group)).run();
    }
    m_begin.bind(1, change.event).bind(2, std::string_view(stateOf(judgement.state)));
    m_begin.bind(3, std::string_view(change.situation->name));
    m_begin.bind(4, std::string_view(change.situation->severity));
    m_begin.bind(5, change.situation->definition).bind(6, std::string_view(change.log));
    m_begin.bind(7, std::string_view(change.node)).bind(8, std::string_view(group));
    m_begin.bind(9, change.raised).bind(10, judgement.count);
    m_begin.bind(11, judgement.first).bind(12, judgement.last);
    m_begin.bind(13, std::string_view(valuesText(judgement.values))).run();
}

void EpisodeTable::keep(const EpisodeShare& share) {
    m_share.bind(1, share.episode->value()).bind(2, std::string_view(share.log));
    m_share.bind(3, share.count).bind(4, share.first).bind(5, share.last).run();
}

AcknowledgementChange EpisodeTable::acknowledge(std::uint64_t episode, const Acknowledgement& by) {
    m_acknowledge.bind(1, by.time).bind(2, std::string_view(by.who));
    m_acknowledge.bind(3, std::string_view(by.note)).bind(4, episode);
    const bool isDone = m_acknowledge.step();
    m_acknowledge.reset();
    return isDone ? AcknowledgementChange::DONE : whyNot(episode);
}

AcknowledgementChange EpisodeTable::withdraw(std::uint64_t episode) {
    const bool isDone = m_withdraw.bind(1, episode).step();
    m_withdraw.reset();
    return isDone ? AcknowledgementChange::DONE : whyNot(episode);
}

AcknowledgementChange EpisodeTable::whyNot(std::uint64_t episode) {
    auto reason = AcknowledgementChange::UNKNOWN;
    if (m_find.bind(1, episode).step()) {
        const bool isOpen = m_find.integer(0) != 0;
        const bool isTaken = m_find.integer(1) != 0;
        reason = !isOpen   ? AcknowledgementChange::RESOLVED
                 : isTaken ? AcknowledgementChange::TAKEN
                           : AcknowledgementChange::NOT_TAKEN;
    }
    m_find.reset();
    return reason;
}

void EpisodeTable::removeUntil(std::uint64_t id) {
    m_remove.bind(1, id).run();
    m_removeShares.bind(1, id).run();
}

std::vector<StoredEpisode> EpisodeTable::open(Database& database) {
    std::vector<StoredEpisode> episodes;
    Statement shares(database,
                     "SELECT log, count, first, last FROM episode_logs WHERE episode = ?");
    Statement rows(
        database,
        "SELECT id, state = 'pause', situation, severity, definition, log,"
        " node, groups, raised, last, text_values, first FROM episodes WHERE state <> 'resolved'"
        " ORDER BY id");
    while (rows.step()) {
        StoredEpisode& episode = episodes.emplace_back();
        episode.id = static_cast<std::uint64_t>(rows.integer(0));
        episode.isPause = rows.integer(1) != 0;
        episode.situation = rows.text(2);
        episode.severity = rows.text(3);
        episode.definition = rows.integer(4);
        episode.log = rows.text(5);
        episode.node = rows.text(6);
        episode.group = valuesOf(rows.text(7));
        episode.raised = rows.integer(8);
        episode.last = rows.integer(9);
        episode.values = valuesOf(rows.text(10));
        episode.first = rows.integer(11);
        shares.bind(1, episode.id);
        while (shares.step()) {
            episode.shares.push_back({nullptr, std::string(shares.text(0)),
                                      static_cast<std::uint64_t>(shares.integer(1)),
                                      shares.integer(2), shares.integer(3)});
        }
        shares.reset();
    }
    return episodes;
}

} // namespace zrm::host
