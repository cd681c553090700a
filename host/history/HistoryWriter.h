#ifndef ZRM_HOST_HISTORY_WRITER_H
#define ZRM_HOST_HISTORY_WRITER_H

#include "host/base/Result.h"
#include "host/base/RetryPause.h"
#include "host/config/HostConfig.h"
#include "host/events/EventJson.h"
#include "host/events/EventQueue.h"
#include "host/events/PositionBook.h"
#include "host/history/Cursors.h"
#include "host/history/EntryBatch.h"
#include "host/history/HistoryDirectory.h"
#include "host/history/HistoryFile.h"
#include "host/history/ReaderPool.h"
#include "host/history/RecentEvents.h"
#include "host/history/RequestedChanges.h"
#include "host/history/RetentionClock.h"
#include "host/silences/Silencer.h"
#include "host/silences/Silences.h"

#include <atomic>
#include <condition_variable>
#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace zrm::host {

/// The only writer of the history, on its own thread: takes events from the queue, stores them in
/// batches and publishes them; stores the sinks' cursors, the logs' positions and the rates;
/// removes expired events, a few at a time. The events of an entry are stored in one transaction
/// with the position behind it, and a position without events is stored after the events before it.
/// A failure is reported once and retried after growing pauses while the events stay in the queue:
/// nothing is lost, and the logs wait. A corrupt file is replaced by a new one, and removed files
/// are created again.
class HistoryWriter {
public:
    using Clock = EventQueue::Clock;

    /// The references outlive the object. `file` is open on the directory's file.
    HistoryWriter(const HistoryConfig& config, HistoryDirectory& directory,
                  std::unique_ptr<HistoryFile> file, RecentEvents& recent, ReaderPool& readers,
                  Cursors& cursors, PositionBook& positions, Silences& silences);
    ~HistoryWriter();
    HistoryWriter(const HistoryWriter&) = delete;
    HistoryWriter& operator=(const HistoryWriter&) = delete;

    /// Starts the thread on the queue's events, which `format` renders. Once.
    void start(EventQueue& queue, EventJson format);

    /// Ends the thread once everything in the closed queue is stored, at the limit at the latest,
    /// or a second later if it does not give up at once. A thread blocked in the system is left
    /// alone until the object is destroyed. Returns the number of events that were not stored. Any
    /// number of times.
    std::uint64_t finish(Clock::time_point limit);

    /// Stores the cursors and the entries once more, after finish. Reports a failure.
    void storeRest();

    /// Adds the entries of a minute. Any thread.
    void addEntries(MinuteCounts counts);

    /// Makes a change of the file on the writer's thread and waits for it. Refused before start and
    /// after the thread's end. Any thread but the writer's.
    Result<void> change(RequestedChanges::Change change);

    /// Id of the oldest event held; 0 when there is none. Any thread.
    std::uint64_t oldest() const noexcept { return m_oldest.load(); }

    /// Why the history cannot store events now; empty: it can. Any thread.
    std::string problem() const;

private:
    void run();
    bool store(EntryBatch& batch);
    bool attempt(const std::function<void()>& work);
    void makeRequestedChanges();
    std::uint64_t silenceOf(std::uint64_t event);
    void succeeded();
    void failed(const std::string& why);
    bool pause();
    Result<void> openFile();
    void replaceFile(const std::string& why);
    void leaveRemovedFiles();
    void reserveIds(std::uint64_t last);
    void housekeep(bool idle);
    void storeCursors();
    void tendCursors();
    void storePositions(bool isLast = false);
    void storeExpected(bool isLast = false);
    void tendPositions();
    void storeEntries();
    void tendSilences();
    HistoryFile::Limits limits();

    const HistoryConfig m_config;
    HistoryDirectory& m_directory;
    std::unique_ptr<HistoryFile> m_file; ///< null while there is none that can be opened
    RecentEvents& m_recent;
    ReaderPool& m_readers;
    Cursors& m_cursors;
    PositionBook& m_positions;
    Silences& m_silences;
    Silencer m_silencer; ///< used by the thread
    RequestedChanges m_requested;
    EventQueue* m_queue = nullptr;
    EventQueue::Reader m_reader = 0;
    std::unique_ptr<EventJson> m_format;
    std::uint64_t m_reserved = 0;        ///< ids up to this one are kept as given
    std::uint64_t m_left = 0;            ///< events that were not stored when the thread ended
    std::atomic<std::size_t> m_taken{0}; ///< events released by the queue before they are stored
    RetentionClock m_clock;
    static constexpr std::chrono::seconds housekeepingInterval{1};
    Clock::time_point m_nextHousekeeping{};
    Clock::time_point m_nextTending{}; ///< of the cursors
    Clock::time_point m_nextTendingOfPositions;
    bool m_hasMoreToDo = false; ///< housekeeping that was not finished
    RetryPause m_pause;
    std::atomic<std::uint64_t> m_oldest{0};

    mutable std::mutex m_mutex; ///< guards what follows
    std::condition_variable m_changed;
    std::string m_problem;
    std::vector<MinuteCounts> m_minutes; ///< still to be stored
    bool m_finishing = false;            ///< finish was called: pauses stay short
    bool m_giveUp = false;               ///< its limit has passed
    bool m_ended = false;                ///< the thread's work is done
    std::thread m_thread;
};

} // namespace zrm::host

#endif
