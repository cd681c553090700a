#include "monitor/LateLines.h"

#include "logs/LineJoin.h"

#include <algorithm>
#include <cerrno>
#include <utility>

namespace zrm {

namespace {

constexpr int readsPerLook = 64; ///< without an entry, of 256 kB each

} // namespace

void LateLines::add(std::unique_ptr<Generation> file, std::int64_t offset, const Tail& tail,
                    Time now) {
    stopReading();
    File added;
    if (!file->status(added.seen) || !added.seen.hasName) {
        return;
    }
    m_hasMoved = true;
    added.file = std::move(file);
    added.offset = offset;
    added.tail = tail;
    added.grown = now;
    added.isDue = added.file->isCompressed() || added.seen.size > offset;
    m_files.push_back(std::move(added));
    leaveSurplus();
}

/// Ends the watch over the oldest files. What they have is still read, unless that is too much.
void LateLines::leaveSurplus() {
    auto file = m_files.begin();
    while (m_files.size() > mostFiles && file != m_files.end()) {
        Generation::Status now;
        const bool hasMore = file->isDue || (file->file->status(now) && now.size > file->seen.size);
        if (hasMore && m_files.size() <= mostDue) {
            ++file;
        } else {
            leave(*file);
            file = m_files.erase(file);
            m_hasMoved = true;
        }
    }
}

bool LateLines::has(const FileIdentity& file) const noexcept {
    return std::any_of(m_files.begin(), m_files.end(),
                       [&file](const File& one) { return one.file->identity() == file; });
}

std::vector<FileIdentity> LateLines::files() const {
    std::vector<FileIdentity> files;
    for (const File& one : m_files) {
        files.push_back(one.file->identity());
    }
    return files;
}

bool LateLines::hasOriginalOf(Generation& file) const {
    return std::any_of(m_files.begin(), m_files.end(),
                       [&file](const File& one) { return file.isCopyOf(*one.file); });
}

std::optional<LogPosition> LateLines::remove(const FileIdentity& file) {
    stopReading();
    const auto found = std::find_if(m_files.begin(), m_files.end(), [&file](const File& one) {
        return one.file->identity() == file;
    });
    if (found == m_files.end()) {
        return std::nullopt;
    }
    const LogPosition position = positionIn(*found);
    m_hasMoved = true;
    m_files.erase(found);
    return position;
}

void LateLines::clear() {
    stopReading();
    for (const File& file : m_files) {
        leave(file);
    }
    m_hasMoved = true;
    m_files.clear();
}

/// What was not read by now is an unfinished line, or cannot be read.
void LateLines::leave(const File& file) {
    m_left.push_back(positionIn(file));
    if (!file.file->isCompressed() && file.seen.size > file.offset) {
        m_ledger.noteLost(file.offset, file.seen.size);
    }
}

bool LateLines::look(Time now) {
    stopReading();
    m_now = now;
    if (std::erase_if(m_files, [&](File& file) { return !checkFile(file, now); }) > 0) {
        m_hasMoved = true;
    }
    leaveSurplus();
    return std::any_of(m_files.begin(), m_files.end(), [](const File& file) { return file.isDue; });
}

/// False if the file is watched no longer.
bool LateLines::checkFile(File& file, Time now) {
    Generation::Status status;
    const bool isCompressed = file.file->isCompressed();
    if (!file.file->status(status) || (!isCompressed && status.size < file.offset)) {
        m_left.push_back(positionIn(file));
        return false; // it was truncated: what it has now is not the log's
    }
    if (!isCompressed && status.size > file.seen.size) {
        file.grown = now;
        file.isDue = true;
    }
    file.seen = status;
    // What was written before the last name was removed is still read.
    if (!file.isDue && (isCompressed || !status.hasName || now - file.grown >= watchedFor)) {
        leave(file);
        return false;
    }
    return true;
}

char* LateLines::next() {
    if (char* const entry = m_read != nullptr ? nextOf(*m_read) : nullptr) {
        return entry;
    }
    for (File& file : m_files) {
        if (file.isDue) {
            if (char* const entry = nextOf(file)) {
                return entry;
            }
        }
    }
    return nullptr;
}

char* LateLines::nextOf(File& file) {
    if (m_read != &file) {
        stopReading();
        m_read = &file;
        m_block.start(file.offset, file.tail);
    }
    for (int reads = 0; reads < readsPerLook; ++reads) {
        if (char* const entry = m_block.next()) {
            return give(entry, file);
        }
        const std::int64_t from = m_block.readTo();
        switch (file.file->verify() ? m_block.fill(*file.file) : EntryBlock::Fill::failed) {
        case EntryBlock::Fill::more:
            m_bytesRead += m_block.readTo() - from;
            continue;
        case EntryBlock::Fill::failed:
            file.isDue = errno == EINTR; // the rest is read when the file has grown again
            if (!file.isDue && file.file->isCompressed()) {
                m_ledger.noteLost(m_block.offset(), m_block.readTo(), file.file->path());
            }
            break;
        case EntryBlock::Fill::end:
            if (m_block.isWaiting() && m_now - file.grown >= m_join->limits().wait) {
                return give(m_block.endWaiting(), file);
            }
            if (file.file->isCompressed()) {
                file.isDue = false;
                if (char* const entry = m_block.rest()) {
                    return give(entry, file);
                }
            }
            file.isDue = m_block.isWaiting();
            break;
        case EntryBlock::Fill::changed: // found to be truncated, or to have grown
            file.isDue = false;
            break;
        }
        break;
    }
    stopReading();
    return nullptr;
}

char* LateLines::give(char* entry, const File& file) noexcept {
    m_modified = std::max(m_modified, file.seen.modified);
    m_hasMoved = true;
    return entry;
}

bool LateLines::takeBack() noexcept {
    m_hasMoved = true;
    return m_block.takeBack();
}

const LatePositions& LateLines::positions() const {
    if (std::exchange(m_hasMoved, false)) {
        std::vector<LogPosition> positions;
        for (const File& file : m_files) {
            positions.push_back(positionIn(file));
        }
        m_positions = LatePositions(std::move(positions));
    }
    return m_positions;
}

void LateLines::stopReading() {
    if (m_read != nullptr) {
        m_read->offset = m_block.offset();
        m_read->tail = m_block.tail();
        m_read = nullptr;
        m_block.release();
    }
}

LogPosition LateLines::positionIn(const File& file) const {
    const bool isRead = &file == m_read;
    LogPosition position =
        positionOf(file.file->identity(), isRead ? m_block.offset() : file.offset,
                   isRead ? m_block.tail() : file.tail);
    position.modified = file.seen.modified;
    return position;
}

std::vector<LateLines::Left> LateLines::takeLeft() {
    std::vector<Left> left;
    for (const LogPosition& position : std::exchange(m_left, {})) {
        left.push_back({position, false});
    }
    for (const File& file : m_files) {
        left.push_back({positionIn(file), true});
    }
    return left;
}

} // namespace zrm
