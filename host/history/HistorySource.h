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

/// The committed events after a sink's cursor: from memory if the sink keeps up, otherwise from the
/// file. Events removed before the sink got to them are skipped, which is logged.
class HistorySource : public EventSource {
public:
    /// `sink` is its name in messages. The references must outlive the object.
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
    Cursor& m_cursor; ///< id of the last event delivered to the sink
    std::shared_ptr<const EventBatch> m_batch;
    std::size_t m_position = 0; ///< index of the next event in the batch
    bool m_failing = false;     ///< the last read of the file failed
};

} // namespace zrm::host

#endif
