#include "logtypes/FollowedReport.h"

#include "base/BrevanTime.h"
#include "base/EntryFields.h"
#include "base/ErrorText.h"
#include "framework/LogEntry.h"
#include "framework/cancellation.h"
#include "logs/ZoneTime.h"
#include "logtypes/EntryReader.h"
#include "logtypes/NewestRows.h"
#include "monitor/BackwardBlock.h"
#include "monitor/EntryBlock.h"
#include "monitor/GenerationNames.h"
#include "monitor/Interruption.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <ctime>
#include <optional>
#include <string_view>
#include <utility>

#include <sys/stat.h>

namespace zrm {

namespace {

constexpr std::size_t stampLength = EntryReader::stampLength;
/// Entries may be out of order by as much: those of several writers, and those of the hour that
/// daylight saving time repeats.
constexpr std::int64_t disorder = 3600;
/// So many entries in a row must be further away before the rest of a file counts as further away
/// still. A clock that was wrong for some entries does not end a report.
constexpr unsigned farEntries = 10'000;
constexpr std::size_t rowsPerProgress = 256;
constexpr unsigned firstEntries = 100; ///< of a file, by which its age is judged
constexpr const char* noFile = "there is no such file";

/// The time stamp so many seconds later. A stamp that is not a time stays.
std::string later(const std::string& stamp, std::int64_t seconds) {
    const CivilTime time = ZoneTime::ofStamp(stamp.c_str());
    std::string result = stamp;
    if (time.isValid()) {
        ZoneTime::writeStamp(time.seconds() + seconds, result.data());
    }
    return result;
}

std::string_view timeOf(const zrm_rmlogent_data_t& row) noexcept {
    return {row.entrytime, stampLength};
}

std::string presentTime() {
    std::string stamp(stampLength, ' ');
    BrevanTime::generateTimestamp(std::time(nullptr), stamp.data());
    return stamp;
}

std::string openProblem(const std::string& path, int error) {
    struct stat status;
    if (error == ENOENT) {
        return stat(path.c_str(), &status) != 0 ? noFile
               : S_ISREG(status.st_mode)        ? "its compression cannot be read"
                                                : "it is not a regular file";
    }
    return std::string("it cannot be opened: ") + ErrorText(error).text();
}

std::string readProblem(const Generation& generation, std::int64_t offset, int error) {
    const std::string place = std::to_string(offset);
    if (generation.isCompressed() && error == ENOMEM) {
        return "decompressing it takes more than 128 MiB of memory";
    }
    return generation.isCompressed()
               ? "it is damaged: only the first " + place + " bytes of its contents can be read" +
                     (offset > 0 ? ", and the last of them may be wrong" : "")
               : "reading it failed before byte " + place + ": " + ErrorText(error).text();
}

std::string fullProblem(std::size_t rows) {
    return "the fields of its newest " + std::to_string(rows) + " entries have " +
           std::to_string(FollowedReport::mostDetails / (1024 * 1024)) +
           " MiB, the most that a report keeps; ask for fewer fields or a shorter period";
}

/// The entry of a block whose row is judged by the conditions of a report.
class ReportedEntry final : public LogEntry {
public:
    explicit ReportedEntry(EntryReader& entries) : m_entries(entries) {}

    /// What the receiver wants to have of the block's last entry; none if its row does not meet the
    /// conditions.
    template <class Block>
    std::optional<FollowedReport::Detail> judge(const Block& block, zrm_rmlogent_data_t& row,
                                                FollowedReport::Receiver& receiver) {
        m_text = block.text();
        m_isCut = block.isTextCut();
        m_hasFields = false;
        const Offer offer(*this);
        return receiver.meets(row) ? std::optional(receiver.describe()) : std::nullopt;
    }

    std::string_view text() const override {
        return m_entries.recordLength() == 0 ? m_text : std::string_view();
    }
    bool isCut() const override { return m_isCut; }
    const EntryFields& fields() override {
        if (!m_hasFields) {
            m_fields.clear();
            m_entries.readFields(m_text, m_fields);
            m_hasFields = true;
        }
        return m_fields;
    }
    const EntryKeep& keep() const override { return m_keep; }

private:
    EntryReader& m_entries;
    std::string_view m_text; ///< or the record
    bool m_isCut = false;
    const EntryKeep m_keep;
    EntryFields m_fields;
    bool m_hasFields = false;
};

} // namespace

FollowedReport::FollowedReport(std::string path, EntryReader& entries, Options options)
    : m_path(std::move(path)), m_entries(entries), m_options(std::move(options)),
      m_longBefore(later(m_options.from, -disorder)), m_longAfter(later(m_options.to, disorder)),
      m_newest(presentTime()) {}

void FollowedReport::run(Receiver& receiver) {
    const Interruption interruption(CTX1_IsCancelled);
    findFiles();
    for (File& file : m_files) {
        if (isEnded() || !readFile(file, receiver)) {
            break;
        }
        show(m_done, receiver);
    }
}

/// Shows how much was read of all files. What the caller has seen once is never less later.
void FollowedReport::show(std::int64_t read, Receiver& receiver) {
    m_read = std::max(m_read, read);
    receiver.progress(m_read, m_total);
}

bool FollowedReport::isEnded() {
    m_isCancelled = m_isCancelled || CTX1_IsCancelled();
    return m_isCancelled || isLimited() || m_isFull;
}

/// The present file is opened first: if it is renamed now, it is recognised among the others.
void FollowedReport::findFiles() {
    m_present = Generation::open(m_path);
    const int error = errno;
    std::string problem = m_present ? "" : openProblem(m_path, error);
    // The generations of a symbolic link are beside the file to which it leads.
    const std::unique_ptr<char, void (*)(void*)> real(realpath(m_path.c_str(), nullptr), std::free);
    std::vector<GenerationFile> generations =
        newestFirst(findGenerations(real ? real.get() : m_path, {}, m_options.rotatedTo));
    // A log may be without a file after a rotation, until its next line is written.
    if (m_present || problem != noFile || generations.empty()) {
        Generation::Status status{};
        const std::int64_t size = m_present && m_present->status(status) ? status.size : 0;
        m_files.push_back({m_path, size, std::nullopt, false, std::move(problem)});
    }
    for (GenerationFile& generation : generations) {
        if (!m_present || generation.identity != m_present->identity()) {
            m_files.push_back(
                {std::move(generation.path), generation.size, generation.identity, false, ""});
        }
    }
    for (const File& file : m_files) {
        m_total += file.size;
    }
}

/// False if the files after this one are older than the report's window.
bool FollowedReport::readFile(File& file, Receiver& receiver) {
    std::unique_ptr<Generation> generation = open(file);
    if (generation && isCopy(*generation)) {
        m_done += file.size;
        return true;
    }
    FirstTimes first;
    if (generation) {
        first = firstTimes(*generation);
        if (first.earliest.empty() || first.earliest <= m_longAfter) {
            file.isRead = true;
            receiver.begin(generation->isCompressed());
            generation->isCompressed() ? readForward(*generation, file, receiver)
                                       : readBackward(*generation, file, receiver);
        }
        m_newest = first.latest.empty() ? m_newest : std::min(m_newest, first.latest);
    }
    if (generation && !generation->isCompressed()) {
        m_younger = std::move(generation);
    }
    m_done += file.size;
    return first.latest.empty() || first.latest >= m_longBefore;
}

/// Whether the next younger file has all that this one has, as if it was copied and not rotated.
bool FollowedReport::isCopy(Generation& older) {
    return m_younger && older.isCopyOf(*m_younger);
}

/// Null, with the file's problem, if it cannot be opened or has become another one.
std::unique_ptr<Generation> FollowedReport::open(File& file) {
    if (!file.identity) {
        return std::move(m_present);
    }
    std::unique_ptr<Generation> generation = Generation::open(file.path);
    const int error = errno;
    if (!generation) {
        file.problem = openProblem(file.path, error);
    } else if (generation->identity() != *file.identity) {
        file.problem = "it was replaced while the report was being read";
        generation.reset();
    }
    return generation;
}

/// The times of the first entries in the first block. A clock that was wrong for some of them, as
/// after the start of a machine, says nothing about the other generations.
FollowedReport::FirstTimes FollowedReport::firstTimes(Generation& generation) {
    FirstTimes times;
    unsigned entries = 0;
    EntryBlock block(m_entries.recordLength(), m_options.join.get());
    block.start(0, {});
    const EntryBlock::Fill filled = block.fill(generation);
    const auto next = [&] {
        char* const entry = block.next();
        return entry == nullptr && block.isWaiting() ? block.endWaiting() : entry;
    };
    char* entry = filled == EntryBlock::Fill::more ? next() : nullptr;
    for (; entry != nullptr && entries < firstEntries; entry = next()) {
        if (!m_entries.read(entry, block.text(), m_newest.data(), m_row)) {
            continue;
        }
        const std::string_view time = timeOf(m_row);
        times.earliest = entries == 0 ? time : std::min<std::string_view>(times.earliest, time);
        times.latest = entries == 0 ? time : std::max<std::string_view>(times.latest, time);
        ++entries;
    }
    return times;
}

/// Reads an entry into the row and compares its time with the report's window.
FollowedReport::Place FollowedReport::place(char* entry, std::string_view text,
                                            const std::string& newest) {
    if (!m_entries.read(entry, text, newest.data(), m_row)) {
        ++m_skipped;
        return Place::unfit;
    }
    const std::string_view time = timeOf(m_row);
    if (time > m_options.to) {
        return time > m_longAfter ? Place::farTooNew : Place::tooNew;
    }
    if (time < m_options.from) {
        return time < m_longBefore ? Place::farTooOld : Place::tooOld;
    }
    if (m_reached.empty() || time < m_reached) {
        m_reached = time;
    }
    return Place::within;
}

/// Counts the entries in a row that are far from the window. True once there are enough.
bool FollowedReport::isFar(Place where, Place farPlace, unsigned& far) noexcept {
    if (where != Place::unfit) {
        far = where == farPlace ? far + 1 : 0;
    }
    return far >= farEntries;
}

void FollowedReport::give(const zrm_rmlogent_data_t& row, const Detail& detail,
                          Receiver& receiver) {
    ++m_given;
    receiver.give(row, detail);
    if (m_given % rowsPerProgress == 0) {
        show(m_read, receiver);
    }
}

void FollowedReport::readBackward(Generation& generation, File& file, Receiver& receiver) {
    BackwardBlock block(m_entries.recordLength(), m_options.join.get());
    block.start(file.size);
    ReportedEntry judged(m_entries);
    std::string newest = m_newest;
    unsigned far = 0;
    for (BackwardBlock::Fill filled = block.fill(generation); filled != BackwardBlock::Fill::end;
         filled = block.fill(generation)) {
        if (filled == BackwardBlock::Fill::changed) {
            file.problem = "it was truncated while the report was being read";
            return;
        }
        if (filled == BackwardBlock::Fill::failed) {
            file.problem = readProblem(generation, block.offset(), errno);
            return;
        }
        while (char* const entry = block.next()) {
            const Place where = place(entry, block.text(), newest);
            if (isFar(where, Place::farTooOld, far)) {
                return;
            }
            if (where != Place::unfit && timeOf(m_row) < newest) {
                newest = timeOf(m_row);
            }
            if (where != Place::within) {
                continue;
            }
            if (const auto detail = judged.judge(block, m_row, receiver)) {
                give(m_row, *detail, receiver);
                if (isLimited()) {
                    return;
                }
            }
        }
        show(m_done + file.size - block.offset(), receiver);
        if (isEnded()) {
            return;
        }
    }
}

/// Keeps the newest rows, as many as may still be given, and gives them at the end.
void FollowedReport::readForward(Generation& generation, File& file, Receiver& receiver) {
    EntryBlock block(m_entries.recordLength(), m_options.join.get());
    block.start(0, {});
    NewestRows kept(m_options.limit - m_given);
    ReportedEntry judged(m_entries);
    bool isPast = false;
    unsigned far = 0;
    const auto look = [&](char* entry) {
        const Place where = place(entry, block.text(), m_newest);
        isPast = isFar(where, Place::farTooNew, far);
        if (where != Place::within) {
            return;
        }
        if (auto detail = judged.judge(block, m_row, receiver)) {
            kept.add(m_row, std::move(*detail));
        }
    };
    for (EntryBlock::Fill filled = EntryBlock::Fill::more; !isPast;) {
        filled = block.fill(generation);
        if (filled == EntryBlock::Fill::end) {
            while (char* const entry = block.rest()) {
                look(entry);
            }
            break;
        }
        if (filled != EntryBlock::Fill::more) {
            file.problem = readProblem(generation, block.readTo(), errno);
            break;
        }
        char* entry = nullptr;
        while (!isPast && (entry = block.next()) != nullptr) {
            look(entry);
        }
        show(m_done + std::min(generation.compressedBytesRead(), file.size), receiver);
        if (isEnded()) {
            return;
        }
    }
    for (auto next = kept.rows().rbegin(); next != kept.rows().rend() && !m_isCancelled; ++next) {
        give(next->row, next->detail, receiver);
    }
    if (kept.isFull()) {
        m_isFull = true;
        file.problem = fullProblem(kept.rows().size());
    }
}

} // namespace zrm
