#ifndef ZRM_HOST_LABEL_TABLE_H
#define ZRM_HOST_LABEL_TABLE_H

#include "host/events/Event.h"
#include "host/history/Statement.h"

#include <cstdint>
#include <map>
#include <string>
#include <string_view>

namespace zrm::host {

/// Numbers for what many events have in common: a situation's name, severity and text, a log, and
/// the silence that holds them back.
/// Used by the writer's thread. Throws DatabaseError.
class LabelTable {
public:
    struct Label {
        std::int64_t id = 0;
        std::int64_t log = 0; ///< number of the log
    };

    explicit LabelTable(Database& database);

    /// The label of an event, created if necessary.
    Label of(const EventRecord& event);

    /// The number of a log's path, created if necessary.
    std::int64_t log(std::string_view path);

    /// After a rollback: forgets the numbers that the transaction has assigned.
    void forget();

    /// Removes the labels that no event uses any more.
    void removeUnused();

private:
    Label findOrMake(const EventRecord& event);

    Database& m_database;
    Statement m_findLog;
    Statement m_makeLog;
    Statement m_findLabel;
    Statement m_makeLabel;
    std::map<std::string, std::int64_t, std::less<>> m_logs;
    /// By the four texts and the silence, zero bytes between.
    std::map<std::string, Label, std::less<>> m_labels;
    std::string m_key; ///< of the last event
    Label m_last;
    std::uint64_t m_lastSilence = 0;
};

} // namespace zrm::host

#endif
