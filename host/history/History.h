#ifndef ZRM_HOST_HISTORY_H
#define ZRM_HOST_HISTORY_H

#include "host/base/Result.h"
#include "host/config/HostConfig.h"
#include "host/events/EventSource.h"
#include "host/events/PositionBook.h"
#include "host/history/Acknowledgements.h"
#include "host/history/Cursors.h"
#include "host/history/HistoryDirectory.h"
#include "host/history/HistoryReader.h"
#include "host/history/HistoryWriter.h"
#include "host/history/ReaderPool.h"
#include "host/history/RecentEvents.h"
#include "host/silences/Silences.h"

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <set>
#include <string>
#include <type_traits>
#include <vector>

namespace zrm::host {

/// The history of events: a SQLite file in a directory of its own, one writer, any number of
/// readers, and a cursor for each sink. Set up, started and finished by one thread at a time; as a
/// reader used by any.
class History : public HistoryReader, public Acknowledgements {
public:
    /// Opens the history of this directory; a new one is made, and a corrupt one is moved aside
    /// for a new one, which is logged. Refused when there can be none.
    static Result<std::unique_ptr<History>> open(const HistoryConfig& config,
                                                 const std::string& directory);

    ~History() override;

    /// A source of events for a sink, from where the sink of this key stood when the agent last
    /// ran; a new one begins with the next event. `name` is how messages call it. Before start.
    std::unique_ptr<EventSource> source(const std::string& key, const std::string& name);

    /// The positions of followed logs, as they were stored and as they move.
    const std::shared_ptr<PositionBook>& positions() const noexcept { return m_positions; }

    /// The silences, as they were stored and as they change.
    Silences& silences() noexcept { return m_silences; }

    /// The paths of the logs of which it has events or counts of entries. Empty if it cannot be
    /// read.
    std::set<std::string> logs();

    /// The rhythms of logs, by path. Empty if they cannot be read.
    std::map<std::string, std::vector<SilentHour>> rhythms();

    /// Begins to store the queue's events, which `format` renders. Their ids follow newest().
    void start(EventQueue& queue, EventJson format);

    /// Stores what is in the queue, at the latest until the limit, and lets the sources end with
    /// it. Says so when something could not be stored. Any number of times.
    void finish(HistoryWriter::Clock::time_point limit);

    /// Keeps the places of sinks that have ended, and the last entries. After finish.
    void storeRest() { m_writer.storeRest(); }

    /// Takes the entries that a minute brought. Any thread.
    void addEntries(MinuteCounts counts) { m_writer.addEntries(std::move(counts)); }

    Result<EventPage> query(const EventFilter& filter) override;
    Result<std::optional<StoredEvent>> event(std::uint64_t id) override;
    std::uint64_t newest() const override { return m_recent.newest(); }
    std::uint64_t waitBeyond(std::uint64_t id, Clock::time_point limit,
                             const std::stop_token& stop) override;
    Result<std::vector<EpisodeRecord>> episodes(const EpisodeFilter& filter) override;
    Result<std::uint64_t> acknowledgedEpisodes() override;
    HistoryState state() override;
    Result<Rates> rates(std::int64_t from, std::int64_t to, std::int64_t step) override;

    Result<AcknowledgementChange> acknowledge(std::uint64_t episode,
                                              const Acknowledgement& by) override;
    Result<AcknowledgementChange> withdraw(std::uint64_t episode) override;

private:
    History(const HistoryConfig& config, std::unique_ptr<HistoryDirectory> directory,
            std::unique_ptr<HistoryFile> file);
    Result<void> keep(const Silence& silence);
    Result<AcknowledgementChange>
    change(std::function<AcknowledgementChange(HistoryFile&)> acknowledgement);
    template <class Work>
    auto reading(Work&& work) -> Result<std::invoke_result_t<Work, Database&>>;
    void noteDamage(const std::vector<std::uint64_t>& events);

    const std::unique_ptr<HistoryDirectory> m_directory;
    RecentEvents m_recent;
    ReaderPool m_readers;
    Cursors m_cursors;
    const std::shared_ptr<PositionBook> m_positions;
    Silences m_silences;
    HistoryFile& m_file; ///< the writer's, before start
    HistoryWriter m_writer;
    bool m_toldOfRest = false; ///< what could not be stored was said

    mutable std::mutex m_mutex;        ///< guards what follows
    std::set<std::uint64_t> m_damaged; ///< events that were found damaged
};

} // namespace zrm::host

#endif
