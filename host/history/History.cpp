#include "host/history/History.h"

#include "base/TraceScope.h"
#include "host/base/Say.h"
#include "host/history/HistoryQuery.h"
#include "host/history/HistorySource.h"
#include "host/history/Schema.h"

#include <algorithm>
#include <cinttypes>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"History.cpp"};

/// Memory for the newest events: more than a sink that keeps up lags behind.
constexpr std::size_t bytesInMemory = std::size_t{8} * 1024 * 1024;

/// The most damaged events remembered, so that each is traced only once.
constexpr std::size_t mostDamaged = 10'000;

/// The newest id of a file about to be moved aside, as far as it can be determined.
std::uint64_t newestOfCorrupt(const std::string& path) {
    try {
        Database database(path, Database::Use::READ);
        return static_cast<std::uint64_t>(database.number("SELECT max(id) FROM events"));
    } catch (const DatabaseError&) {
        return 0;
    }
}

/// The positions of logs in a file about to be moved aside, if they can be read. The files' guards
/// tell whether they still fit.
PositionValues positionsOfCorrupt(const std::string& path) {
    try {
        Database database(path, Database::Use::READ);
        return PositionTable::read(database);
    } catch (const DatabaseError&) {
        return {};
    }
}

/// The silences in a file about to be moved aside, if they can be read.
std::vector<Silence> silencesOfCorrupt(const std::string& path) {
    try {
        Database database(path, Database::Use::READ);
        return SilenceTable::read(database).silences;
    } catch (const DatabaseError&) {
        return {};
    }
}

/// The id after which a file with this newest event continues: if the file is new or an older copy,
/// ids used since then are not reused.
std::uint64_t newestWith(const HistoryDirectory& directory, std::uint64_t newest) {
    const std::uint64_t reserved = directory.reservedIds();
    const bool isLost = newest == 0 || newest + HistoryDirectory::idsAtOnce < reserved;
    return isLost ? reserved : newest;
}

/// Opens the file. A corrupt one is replaced.
Result<std::unique_ptr<HistoryFile>> openOrReplace(const HistoryDirectory& directory) {
    const auto cannotOpen = [&](const char* why, const char* cure) {
        return refused("cannot open " + directory.file() + ": " + why, cure);
    };
    const auto open = [&](std::uint64_t newest) {
        auto file = std::make_unique<HistoryFile>(directory.file());
        const std::uint64_t last = newestWith(directory, std::max(newest, file->newest()));
        if (last > file->newest()) {
            file->continueAfter(last);
        }
        return file;
    };
    try {
        try {
            return open(0);
        } catch (const DatabaseError& error) {
            if (!error.isCorruption()) {
                throw;
            }
            const std::uint64_t newest = newestOfCorrupt(directory.file());
            const PositionValues positions = positionsOfCorrupt(directory.file());
            const std::vector<Silence> silences = silencesOfCorrupt(directory.file());
            if (const Result<void> moved = directory.moveAside(error.what()); !moved) {
                return tl::unexpected(moved.error());
            }
            auto file = open(newest);
            file->keepPositions(positions);
            file->keepSilences(silences);
            return file;
        }
    } catch (const SchemaTooNew& error) {
        return cannotOpen(error.what(),
                          "use the program that wrote it, or move the file out of the way");
    } catch (const DatabaseError& error) {
        return cannotOpen(error.what(), "");
    }
}

} // namespace

Result<std::unique_ptr<History>> History::open(const HistoryConfig& config,
                                               const std::string& directory) {
    TraceScope trace(anchor);
    auto place = HistoryDirectory::open(directory);
    if (!place) {
        return tl::unexpected(place.error());
    }
    auto file = openOrReplace(**place);
    if (!file) {
        return tl::unexpected(file.error());
    }
    return std::unique_ptr<History>(new History(config, std::move(*place), std::move(*file)));
}

History::History(const HistoryConfig& config, std::unique_ptr<HistoryDirectory> directory,
                 std::unique_ptr<HistoryFile> file)
    : m_directory(std::move(directory)), m_recent(bytesInMemory, file->newest()),
      m_readers(m_directory->file()),
      m_positions(std::make_shared<PositionBook>(file->positions(), true)),
      m_silences(file->silences()), m_file(*file),
      m_writer(config, *m_directory, std::move(file), m_recent, m_readers, m_cursors, *m_positions,
               m_silences) {
    m_silences.storeWith([this](const Silence& silence) { return keep(silence); });
    m_positions->setEpisodes(m_file.openEpisodes());
    m_positions->expected().load(m_file.expected());
}

History::~History() {
    m_recent.end();
}

std::set<std::string> History::logs() {
    return reading([](Database& database) {
               std::set<std::string> paths;
               Statement logs(database, "SELECT path FROM logs");
               while (logs.step()) {
                   paths.emplace(logs.text(0));
               }
               return paths;
           })
        .value_or(std::set<std::string>());
}

std::map<std::string, std::vector<SilentHour>> History::rhythms() {
    return reading([](Database& database) { return RhythmTable::read(database); })
        .value_or(std::map<std::string, std::vector<SilentHour>>());
}

std::unique_ptr<EventSource> History::source(const std::string& key, const std::string& name) {
    std::uint64_t event = newest();
    try {
        event = std::min(m_file.cursor(key).value_or(event), event);
    } catch (const DatabaseError& error) {
        say("the place of %s in the history cannot be read (%s); it gets new events only",
            name.c_str(), error.what());
    }
    return std::make_unique<HistorySource>(name, m_recent, m_readers, m_cursors.add(key, event));
}

void History::start(EventQueue& queue, EventJson format) {
    TraceScope trace(anchor);
    m_writer.start(queue, std::move(format));
}

void History::finish(HistoryWriter::Clock::time_point limit) {
    TraceScope trace(anchor);
    const std::uint64_t left = m_writer.finish(limit);
    m_recent.end();
    if (left > 0 && !std::exchange(m_toldOfRest, true)) {
        const bool hasFollowed = !m_positions->positions().empty();
        say("%" PRIu64 " events were not stored in the history %s: %s%s", left,
            m_directory->file().c_str(), m_writer.problem().c_str(),
            hasFollowed ? "; entries of [[log]] logs are read again at the next start" : "");
    }
}

/// The writer may have been told to wait no longer when it makes the change: it needs a copy.
Result<void> History::keep(const Silence& silence) {
    return m_writer.change([silence](HistoryFile& file) { file.keepSilences({silence}); });
}

/// The same holds for what the change leaves behind.
Result<AcknowledgementChange>
History::change(std::function<AcknowledgementChange(HistoryFile&)> acknowledgement) {
    const auto outcome = std::make_shared<AcknowledgementChange>();
    const Result<void> stored = m_writer.change(
        [outcome, make = std::move(acknowledgement)](HistoryFile& file) { *outcome = make(file); });
    return stored.map([&] { return *outcome; });
}

Result<AcknowledgementChange> History::acknowledge(std::uint64_t episode,
                                                   const Acknowledgement& by) {
    TraceScope trace(anchor);
    return change([episode, by](HistoryFile& file) { return file.acknowledge(episode, by); });
}

Result<AcknowledgementChange> History::withdraw(std::uint64_t episode) {
    TraceScope trace(anchor);
    return change([episode](HistoryFile& file) { return file.withdraw(episode); });
}

template <class Work>
auto History::reading(Work&& work) -> Result<std::invoke_result_t<Work, Database&>> {
    try {
        ReaderPool::Lease lease = m_readers.take();
        return work(*lease);
    } catch (const DatabaseError& error) {
        if (error.isCorruption()) {
            m_readers.noteCorruption();
        }
        return refused(error.what());
    }
}

Result<EventPage> History::query(const EventFilter& filter) {
    Result<EventPage> page =
        reading([&](Database& database) { return HistoryQuery(database, filter).run(); });
    if (page) {
        noteDamage(page->damaged);
    }
    return page;
}

/// Traces newly found damage.
void History::noteDamage(const std::vector<std::uint64_t>& events) {
    TraceScope trace(anchor);
    const std::lock_guard guard(m_mutex);
    for (const std::uint64_t event : events) {
        if (m_damaged.size() < mostDamaged && m_damaged.insert(event).second) {
            trace.error()("Event %" PRIu64 " in the history %s is damaged: its content is not what "
                          "was written.",
                          event, m_directory->file().c_str());
        }
    }
}

Result<std::optional<StoredEvent>> History::event(std::uint64_t id) {
    if (id == 0 || id > newest()) {
        return std::nullopt;
    }
    EventFilter filter;
    filter.after = id - 1;
    filter.before = id + 1;
    filter.limit = 1;
    Result<EventPage> page = query(filter);
    if (!page) {
        return tl::unexpected(page.error());
    }
    if (!page->damaged.empty()) {
        return refused("event " + std::to_string(id) +
                       " is damaged: its content is not what was written");
    }
    return page->events.empty() ? std::nullopt : std::optional(std::move(page->events.front()));
}

std::uint64_t History::waitBeyond(std::uint64_t id, Clock::time_point limit,
                                  const std::stop_token& stop) {
    return m_recent.waitBeyond(id, limit, stop);
}

Result<std::vector<EpisodeRecord>> History::episodes(const EpisodeFilter& filter) {
    return reading([&](Database& database) { return EpisodeReader::read(database, filter); });
}

Result<std::uint64_t> History::acknowledgedEpisodes() {
    return reading([](Database& database) { return EpisodeReader::countAcknowledged(database); });
}

HistoryState History::state() {
    HistoryState state;
    state.oldest = m_writer.oldest();
    state.newest = newest();
    state.events = state.oldest == 0 ? 0 : state.newest - std::min(state.oldest - 1, state.newest);
    state.bytes = m_directory->bytes();
    state.problem = m_writer.problem();
    const std::lock_guard guard(m_mutex);
    state.damaged = m_damaged.size();
    return state;
}

Result<Rates> History::rates(std::int64_t from, std::int64_t to, std::int64_t step) {
    return reading([&](Database& database) { return RateTable::read(database, from, to, step); });
}

} // namespace zrm::host
