#include "monitor/EarlierEntries.h"

#include "monitor/Interruption.h"

#include <algorithm>
#include <cstdlib>
#include <ctime>
#include <iterator>
#include <utility>

namespace zrm {

namespace {

constexpr std::int64_t firstStep = 64 * 1024; ///< bytes, doubled from step to step
constexpr int entriesPerLook = 16;
constexpr int entriesPerClock = 1024; ///< entries between two looks at the clock

/// Gives the whole entries of a file that begin in a range of it.
class RangeReader {
public:
    RangeReader(Generation& file, std::int64_t from, std::int64_t to, std::size_t recordLength,
                const LineJoin* join)
        : m_file(file), m_to(to), m_block(recordLength, join), m_isLines(recordLength == 0),
          // The reading may begin within a line.
          m_isFirst(m_isLines && from > 0) {
        m_block.start(m_isLines ? from : from - from % static_cast<std::int64_t>(recordLength), {});
        if (!file.isCompressed()) {
            m_block.endAt(to); // lines behind that continue those before it were judged apart
        }
    }

    /// Null at the end, and where the file cannot be read.
    char* next() {
        for (;;) {
            char* entry = m_block.next();
            if (entry == nullptr) {
                const EntryBlock::Fill fill = m_block.fill(m_file);
                if (fill == EntryBlock::Fill::more) {
                    continue;
                }
                entry = fill == EntryBlock::Fill::end ? m_block.rest() : nullptr;
            }
            if (entry == nullptr || m_block.offset() > m_to) {
                return nullptr;
            }
            if (!std::exchange(m_isFirst, false)) {
                return entry;
            }
        }
    }

    /// Of the last entry.
    std::string_view text() const noexcept { return m_block.text(); }

private:
    Generation& m_file;
    const std::int64_t m_to;
    EntryBlock m_block;
    const bool m_isLines;
    bool m_isFirst;
};

} // namespace

void EarlierEntries::read(Generation& file, std::int64_t offset, std::int64_t period,
                          const TimeOf& timeOf, const Take& take) {
    const auto begin = std::chrono::steady_clock::now();
    {
        const Interruption inTime(
            [begin] { return std::chrono::steady_clock::now() - begin > patience / 2; });
        findParts(file, offset, period, timeOf);
    }
    const auto end = begin + patience;
    int entries = 0;
    const auto takeInTime = [&](char* entry, std::string_view text) {
        return take(entry, text) &&
               (++entries % entriesPerClock != 0 || std::chrono::steady_clock::now() < end);
    };
    for (auto part = m_parts.rbegin(); part != m_parts.rend(); ++part) {
        if (!readPart(*part, takeInTime)) {
            break;
        }
    }
}

void EarlierEntries::findParts(Generation& file, std::int64_t offset, std::int64_t period,
                               const TimeOf& timeOf) {
    if (addPart(file, offset, period, timeOf)) {
        return;
    }
    for (const GenerationFile& older : olderThan(file)) {
        std::unique_ptr<Generation> generation = Generation::open(older.path);
        const auto isCopied = [&](const Part& part) { return generation->isCopyOf(*part.file); };
        if (!generation || generation->isCopyOf(file) ||
            std::any_of(m_parts.begin(), m_parts.end(), isCopied)) {
            continue;
        }
        const bool isFound = addPart(*generation, endOf(*generation), period, timeOf);
        m_older.push_back(std::move(generation));
        if (isFound) {
            return;
        }
    }
}

/// How far an older generation is read.
std::int64_t EarlierEntries::endOf(const Generation& file) const noexcept {
    for (const LogPosition& late : m_late.files()) {
        if (identityOf(late) == file.identity()) {
            return late.offset;
        }
    }
    Generation::Status status;
    return !file.isCompressed() && file.status(status) ? status.size : mostBytes;
}

/// Adds as much of the file before `to` as is needed. True if that is enough.
bool EarlierEntries::addPart(Generation& file, std::int64_t to, std::int64_t period,
                             const TimeOf& timeOf) {
    if (to == 0) {
        return false;
    }
    if (!m_periodBegin) {
        m_periodBegin = newestTime(file, to, timeOf) - period;
    }
    if (!file.verify()) {
        m_unread.push_back(file.path());
        return false;
    }
    std::int64_t from = 0;
    bool isFound = false;
    if (file.isCompressed()) {
        // Read forward, however much of it is needed.
        isFound = isBeforePeriod(file, 0, timeOf);
        m_room -= mostBytes / 4;
    } else {
        std::int64_t step = firstStep;
        do {
            from = std::max<std::int64_t>({to - step, to - m_room, 0});
            isFound = isBeforePeriod(file, from, timeOf);
            step *= 2;
        } while (!isFound && from > 0 && to - from < m_room);
        m_room -= to - from;
    }
    m_parts.push_back({&file, from, to});
    return isFound || m_room <= 0;
}

/// The generations older than the file, the newest first.
std::vector<GenerationFile> EarlierEntries::olderThan(const Generation& file) const {
    const std::unique_ptr<char, void (*)(void*)> real(realpath(m_path.c_str(), nullptr), std::free);
    std::vector<GenerationFile> files =
        newestFirst(findGenerations(real ? real.get() : m_path, {}, m_rotatedTo));
    const auto self = std::find_if(files.begin(), files.end(), [&file](const GenerationFile& one) {
        return one.identity == file.identity();
    });
    if (self != files.end()) {
        files.erase(files.begin(), self + 1);
    }
    return files;
}

/// The time of the last entry before `to` that has one, else that of the file's last change.
std::int64_t EarlierEntries::newestTime(Generation& file, std::int64_t to,
                                        const TimeOf& timeOf) const {
    std::optional<std::int64_t> newest;
    if (!file.isCompressed()) {
        RangeReader reader(file, std::max<std::int64_t>(to - firstStep, 0), to, m_recordLength,
                           m_join);
        while (char* const entry = reader.next()) {
            if (const auto range = timeOf(entry, reader.text())) {
                newest = range->earliest;
            }
        }
    }
    Generation::Status status{};
    if (!newest && file.status(status)) {
        newest = status.modified / 1'000'000'000;
    }
    return newest.value_or(std::time(nullptr));
}

/// True if the entries at this place are older than the period. One alone may be out of order.
bool EarlierEntries::isBeforePeriod(Generation& file, std::int64_t at, const TimeOf& timeOf) const {
    RangeReader reader(file, at, INT64_MAX, m_recordLength, m_join);
    bool hasTime = false;
    for (int entries = 0; entries < entriesPerLook; ++entries) {
        char* const entry = reader.next();
        const auto range = entry != nullptr ? timeOf(entry, reader.text()) : std::nullopt;
        if (range && range->latest > *m_periodBegin) {
            return false;
        }
        hasTime = hasTime || range.has_value();
        if (entry == nullptr) {
            break;
        }
    }
    return hasTime;
}

bool EarlierEntries::readPart(const Part& part, const Take& take) const {
    RangeReader reader(*part.file, part.from, part.to, m_recordLength, m_join);
    while (char* const entry = reader.next()) {
        if (!take(entry, reader.text())) {
            return false;
        }
    }
    return true;
}

} // namespace zrm
