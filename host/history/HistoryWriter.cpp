#include "host/history/HistoryWriter.h"

#include "base/TraceScope.h"
#include "host/base/Say.h"
#include "host/events/AgentNode.h"
#include "host/history/Schema.h"

#include <algorithm>
#include <cinttypes>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"HistoryWriter.cpp"};

constexpr std::size_t batchSize = 512; ///< events per transaction, at most
/// For the thread, to see that its time is over.
constexpr std::chrono::seconds givingUpTime{1};
constexpr std::chrono::milliseconds firstPause{100};
constexpr std::chrono::milliseconds longestPause{10'000};
/// After the start; until then nobody knows which logs are still followed.
constexpr std::chrono::minutes timeUntilLogsAreFollowed{1};

} // namespace

HistoryWriter::HistoryWriter(const HistoryConfig& config, HistoryDirectory& directory,
                             std::unique_ptr<HistoryFile> file, RecentEvents& recent,
                             ReaderPool& readers, Cursors& cursors, PositionBook& positions,
                             Silences& silences)
    : m_config(config), m_directory(directory), m_file(std::move(file)), m_recent(recent),
      m_readers(readers), m_cursors(cursors), m_positions(positions), m_silences(silences),
      m_silencer(silences, AgentNode::name(),
                 [this](std::uint64_t event) { return silenceOf(event); }),
      m_requested([this] { m_queue->wake(); }),
      m_nextTendingOfPositions(Clock::now() + timeUntilLogsAreFollowed),
      m_pause(firstPause, longestPause), m_oldest(m_file->oldest()) {}

HistoryWriter::~HistoryWriter() {
    finish(Clock::now());
    if (m_thread.joinable()) {
        m_thread.join();
    }
}

void HistoryWriter::start(EventQueue& queue, EventJson format) {
    m_queue = &queue;
    m_reader = queue.addReader();
    m_format = std::make_unique<EventJson>(std::move(format));
    m_thread = std::thread(&HistoryWriter::run, this);
}

void HistoryWriter::run() {
    TraceScope trace(anchor);
    EntryBatch batch;
    for (;;) {
        makeRequestedChanges();
        const auto now = Clock::now();
        const auto limit = m_hasMoreToDo ? now : now + housekeepingInterval;
        const std::span<const Event> events = m_queue->read(m_reader, batchSize, limit);
        if (events.empty()) {
            if (m_queue->ended(m_reader)) {
                break;
            }
            if (Clock::now() < limit) { // woken, perhaps because a log has its first position
                m_nextHousekeeping = now;
            }
            housekeep(true);
            continue;
        }
        const std::size_t added = batch.add(events, *m_format, &m_silencer);
        if (!batch.isWhole()) {
            // An entry with more events than the queue gives at once: the rest is in the queue.
            m_taken += added;
            m_queue->release(m_reader, added);
            continue;
        }
        if (!store(batch)) {
            break;
        }
        m_queue->release(m_reader, added);
        m_taken = 0;
        housekeep(false);
    }
    m_requested.end();
    {
        const std::lock_guard guard(m_mutex);
        m_ended = true;
    }
    m_changed.notify_all();
}

/// Where they cannot be made, whoever has asked for them hears it.
void HistoryWriter::makeRequestedChanges() {
    bool isOpen = false;
    const auto work = [&] {
        isOpen = true;
        m_requested.run(*m_file);
    };
    // A change that fails is refused by itself; those that come after it may succeed.
    if (m_requested.areWaiting() && !attempt(work) && !isOpen) {
        m_requested.refuseAll(problem());
    }
}

/// The silence of a stored event. One that cannot be read is taken for an event that was delivered.
std::uint64_t HistoryWriter::silenceOf(std::uint64_t event) {
    std::uint64_t silence = 0;
    attempt([&] { silence = m_file->silenceOf(event); });
    return silence;
}

/// Stores the batch, makes its events known, and begins the next. False when the end comes before
/// it can be stored.
bool HistoryWriter::store(EntryBatch& batch) {
    batch.seal();
    const std::shared_ptr<const EventBatch> events = batch.events();
    if (batch.endsEpisodes()) {
        batch.addReached(m_positions.unsavedReached(events->last()));
    }
    const std::vector<PositionValue> positions = batch.positions();
    const auto work = [&] {
        if (events->last() > m_reserved) {
            // Counted from what is stored: a crash before this batch is stored is then not taken
            // for a lost file, after which ids are skipped.
            reserveIds(std::max(m_recent.newest() + HistoryDirectory::idsAtOnce, events->last()));
        }
        const std::vector<CursorValue> moved = m_cursors.unsaved();
        m_file->store(*events, moved, positions, batch.episodes());
        m_cursors.saved(moved);
        m_positions.saved(positions);
        m_oldest.store(m_file->oldest());
    };
    while (!attempt(work)) {
        if (!pause()) {
            return false;
        }
    }
    m_silences.count(events->silenced());
    m_recent.publish(events);
    batch = EntryBatch();
    batch.reserve(events->textBytes() + events->textBytes() / 8);
    return true;
}

/// Does work on the file, which is opened or exchanged first where it must be. False when that
/// failed.
bool HistoryWriter::attempt(const std::function<void()>& work) {
    try {
        if (const Result<void> opened = openFile(); !opened) {
            failed(opened.error().text());
            return false;
        }
        work();
        succeeded();
        return true;
    } catch (const DatabaseError& error) {
        if (error.isCorruption()) {
            replaceFile(error.what());
        } else {
            failed(error.what());
        }
    } catch (const SchemaTooNew& error) {
        failed(error.what());
    }
    return false;
}

/// Opens the file unless it is open.
Result<void> HistoryWriter::openFile() {
    if (m_file != nullptr) {
        return {};
    }
    if (Result<void> restored = m_directory.restore(); !restored) {
        return restored;
    }
    m_file = std::make_unique<HistoryFile>(m_directory.file());
    if (m_file->newest() > m_recent.newest()) {
        replaceFile("it is another history, put into its place while the agent ran");
        return refused("the history's file was replaced");
    }
    m_file->continueAfter(m_recent.newest());
    m_file->keepSilences(m_silences.list());
    reserveIds(std::max(m_reserved, m_recent.newest()));
    return {};
}

/// Records in the lock file that ids up to this one may have been given.
void HistoryWriter::reserveIds(std::uint64_t last) {
    m_directory.reserveIds(last);
    m_reserved = last;
}

void HistoryWriter::succeeded() {
    m_pause.reset();
    const std::lock_guard guard(m_mutex);
    if (!m_problem.empty()) {
        TraceScope trace(anchor);
        trace.error()("The history takes events again.");
        m_problem.clear();
    }
}

void HistoryWriter::failed(const std::string& why) {
    TraceScope trace(anchor);
    const std::lock_guard guard(m_mutex);
    if (m_problem.empty()) {
        trace.error()("Error writing the history %s: %s. Trying again.", m_directory.file().c_str(),
                      why.c_str());
    } else {
        trace.detail()("The history still cannot be written: %s.", why.c_str());
    }
    m_problem = why;
}

/// False when it is time to give up.
bool HistoryWriter::pause() {
    std::unique_lock lock(m_mutex);
    const auto length = m_finishing ? firstPause : m_pause.next();
    m_changed.wait_for(lock, length,
                       [&, early = !m_finishing] { return m_giveUp || (early && m_finishing); });
    return !m_giveUp;
}

void HistoryWriter::replaceFile(const std::string& why) {
    TraceScope trace(anchor);
    // SQLite clears up by name when it closes: nobody may have the file open when the name changes.
    m_readers.suspend();
    m_file.reset();
    const Result<void> moved = m_directory.moveAside(why);
    m_readers.resume();
    if (!moved) {
        failed(moved.error().text());
        return;
    }
    m_cursors.forgetSaved();
    m_positions.forgetSaved();
    m_oldest.store(0);
}

/// Files that were removed while they were in use take what is written with them: this notices it
/// and lets the next attempt begin with new ones. Where the log alone is gone, nothing is lost.
void HistoryWriter::leaveRemovedFiles() {
    TraceScope trace(anchor);
    using State = OpenFiles::State;
    const State state = m_file == nullptr ? State::IN_PLACE : m_file->files().state();
    if (state == State::IN_PLACE) {
        return;
    }
    m_readers.suspend();
    try {
        if (state == State::WITHOUT_LOG) {
            m_file->emptyLog();
        }
    } catch (const DatabaseError& error) {
        failed(error.what());
    }
    const OpenFiles files = m_file->files();
    m_file.reset();
    files.removeLog();
    m_readers.resume();
    m_cursors.forgetSaved();
    m_positions.forgetSaved();
    m_oldest.store(0);
    failed(state == State::WITHOUT_LOG
               ? "its write-ahead log was removed while the agent ran"
               : "its files were removed or replaced while the agent ran; a new history follows");
}

std::uint64_t HistoryWriter::finish(Clock::time_point limit) {
    TraceScope trace(anchor);
    if (m_thread.joinable()) {
        m_queue->close();
        {
            std::unique_lock lock(m_mutex);
            m_finishing = true;
            m_changed.notify_all();
            m_changed.wait_until(lock, limit, [&] { return m_ended; });
            m_giveUp = true;
        }
        m_changed.notify_all();
        m_left = m_queue->backlog(m_reader) + m_taken.load();
        std::unique_lock lock(m_mutex);
        if (m_changed.wait_for(lock, givingUpTime, [&] { return m_ended; })) {
            lock.unlock();
            m_thread.join();
            m_left = m_queue->backlog(m_reader) + m_taken.load();
        }
    }
    return trace.result(m_left);
}

void HistoryWriter::storeRest() {
    if (m_thread.joinable()) {
        say("the history %s does not answer; sinks may get events twice",
            m_directory.file().c_str());
        return;
    }
    const bool stored = attempt([&] {
        storeCursors();
        storePositions(true);
        storeExpected(true);
        storeEntries();
    });
    if (!stored) {
        say("the history %s could not be written at the end: %s; sinks may get events twice",
            m_directory.file().c_str(), problem().c_str());
        return;
    }
    attempt([&] { // the sinks were in use until now
        m_cursors.forgetSaved();
        storeCursors();
    });
    reserveIds(m_recent.newest());
}

Result<void> HistoryWriter::change(RequestedChanges::Change change) {
    return m_queue == nullptr ? refused("the history does not take events yet")
                              : m_requested.make(std::move(change));
}

std::string HistoryWriter::problem() const {
    const std::lock_guard guard(m_mutex);
    return m_problem;
}

} // namespace zrm::host
