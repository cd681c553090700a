#ifndef ZRM_HOST_HISTORY_SOURCE_H
#define ZRM_HOST_HISTORY_SOURCE_H

#include "host/events/EventSource.h"
#include "host/history/Cursors.h"
#include "host/history/EventBatch.h"
#include "host/history/ReaderPool.h"
#include "host/history/RecentEvents.h"

#include <cstdint>
#include <memory>
#include <string>

namespace zrm::host {

class StoredEventRow;

/// The committed events of the history behind a sink's cursor: from memory where the sink keeps
/// up, else from the file. What was removed before the sink got to it is passed over, and told.
class HistorySource : public EventSource {
public:
    /// `sink` is how messages call it. The references outlive the object.
    HistorySource(std::string sink, RecentEvents& recent, ReaderPool& readers, Cursor& cursor);

    std::span<const EventRecord> read(std::size_t most) override;
    void release(std::size_t count) override;
    std::uint64_t backlog() const override;
    void end() override { m_recent.end(); }

private:
    bool fetch();
    bool load();
    std::shared_ptr<const EventBatch> readFile();
    bool addTo(EventBatch& batch, const StoredEventRow& row);
    void use(std::shared_ptr<const EventBatch> batch);
    void passOver(std::uint64_t next);

    const std::string m_sink;
    RecentEvents& m_recent;
    ReaderPool& m_readers;
    Cursor& m_cursor; ///< id of the last event that the sink has got
    std::shared_ptr<const EventBatch> m_batch;
    std::size_t m_position = 0; ///< in the batch: the next event
    bool m_failing = false;     ///< the last reading of the file failed
};

} // namespace zrm::host

#endif
