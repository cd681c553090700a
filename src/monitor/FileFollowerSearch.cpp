#include "monitor/FileFollower.h"

#include "monitor/Interruption.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <utility>

#include <sys/stat.h>

namespace zrm {

// Finds the files of a followed log: the one that has the name, the one that has a position, and
// the generations between the two.

namespace {

/// A rotation may go on while the directory is read.
constexpr int mostAttempts = 5;
/// Files opened at a time; the others follow when these have been read.
constexpr std::size_t mostOpen = 32;

/// Which of two holders of a position to read: the plain one, then the one with more to read.
bool isBetterHolder(const GenerationFile& a, const GenerationFile& b) noexcept {
    return a.isCompressed != b.isCompressed ? !a.isCompressed : a.size > b.size;
}

/// True if the file is not there any more, just after it could not be opened or was.
bool hasVanished(const Generation* opened, const GenerationFile& file) noexcept {
    const int number = errno;
    return opened != nullptr ? !(opened->identity() == file.identity)
                             : number == ENOENT && !file.isCompressed;
}

} // namespace

/// The file that has the log's name. Null if there is none or it cannot be read; the ledger says
/// so.
std::unique_ptr<Generation> FileFollower::openNamed() {
    struct stat status;
    int number = stat(m_path.c_str(), &status) == 0 ? 0 : errno;
    const char* call = "stat";
    std::unique_ptr<Generation> named;
    if (number == 0 && !S_ISREG(status.st_mode)) {
        m_ledger.setState(FollowLedger::State::notAFile);
        m_wasAbsent = true;
        succeed(m_nameRetry);
        return named;
    }
    if (number == 0) {
        named = Generation::open(m_path);
        number = named ? 0 : errno;
        call = "open";
    }
    if (number == 0) {
        succeed(m_nameRetry);
        if (!m_owner.ask(named->identity())) {
            m_ledger.setState(FollowLedger::State::taken);
            named.reset();
        }
    } else if (number == ENOENT || number == ENOTDIR) {
        m_wasAbsent = true;
        m_ledger.setState(m_chain.empty() ? FollowLedger::State::waiting
                                          : FollowLedger::State::missing);
        succeed(m_nameRetry);
    } else {
        if (number == EMFILE) {
            m_late.clear();
        }
        fail(m_nameRetry, call, number);
    }
    return named;
}

/// The files beside the log, or beside the target of a symbolic link, and those that rotation has
/// moved.
std::vector<GenerationFile> FileFollower::generations(const std::vector<ino_t>& inodes) {
    const std::unique_ptr<char, void (*)(void*)> real(realpath(m_path.c_str(), nullptr), std::free);
    if (real) {
        m_siblings = real.get();
    }
    return findGenerations(m_siblings.empty() ? m_path : m_siblings, inodes, m_options.rotatedTo);
}

/// A generation that cannot be read is tried again before those after it are read; after some
/// failures it is lost.
void FileFollower::noteUnreadable(const Found::Unreadable& unreadable,
                                  const std::vector<GenerationFile>& files, Found& found) const {
    const GenerationFile& file = unreadable.file;
    const std::string original = file.path.substr(0, file.path.rfind('.'));
    const bool isBeingCompressed =
        file.isCompressed &&
        (original == m_path || original == m_siblings ||
         std::any_of(files.begin(), files.end(),
                     [&original](const GenerationFile& other) { return other.path == original; }));
    if (file.size == 0 || isBeingCompressed) {
        return;
    }
    if (m_options.byName && m_youngerRetry.failures < mostReadFailures) {
        found.awaited = unreadable;
        found.isAll = false;
    } else {
        found.lost.push_back(file);
    }
}

bool FileFollower::isCountedLost(const GenerationFile& file) const noexcept {
    return std::find(m_givenUp.begin(), m_givenUp.end(), GivenUp{file.identity, file.modified}) !=
           m_givenUp.end();
}

/// Notes what cannot be read, and waits if it is to be tried again. `from`, `to`: what the first of
/// the lost ones would have been read for, as far as that is known.
void FileFollower::takeUnreadable(const Found& found, std::int64_t from, std::int64_t to) {
    if (found.isInterrupted) {
        return;
    }
    if (found.awaited) {
        fail(m_youngerRetry, found.awaited->call, found.awaited->number, found.awaited->file.path);
        return;
    }
    for (const GenerationFile& file : found.lost) {
        const std::int64_t size = file.isCompressed ? 0 : file.size; // of its contents
        m_ledger.noteLost(from, std::max({from, to, size}), file.path);
        from = to = 0;
        giveUp({file.identity, file.modified});
    }
    succeed(m_youngerRetry);
}

void FileFollower::giveUp(const GivenUp& file) {
    if (m_givenUp.size() == mostGivenUp) {
        m_givenUp.erase(m_givenUp.begin());
    }
    m_givenUp.push_back(file);
}

bool FileFollower::isKnown(const FileIdentity& file, const Generation* named) const noexcept {
    return (named != nullptr && named->identity() == file) ||
           std::any_of(m_chain.begin(), m_chain.end(),
                       [&file](const Member& member) { return member.file->identity() == file; });
}

FileFollower::Found FileFollower::find(const LogPosition& position, Search search,
                                       Generation* named) {
    Found found;
    for (int attempt = 0; attempt < mostAttempts; ++attempt) {
        found = Found{};
        if (tryFind(position, search, named, found)) {
            break;
        }
    }
    found.isInterrupted = Interruption::isDue();
    return found;
}

FileFollower::Found FileFollower::findYounger(const GenerationReference& reference,
                                              Generation* named) {
    Found found;
    for (int attempt = 0; attempt < mostAttempts; ++attempt) {
        found = Found{};
        if (openYounger(reference, generations(), named, found)) {
            break;
        }
    }
    found.isInterrupted = Interruption::isDue();
    return found;
}

/// False if a file of the directory's list was gone when it was to be opened.
bool FileFollower::tryFind(const LogPosition& position, Search search, Generation* named,
                           Found& found) {
    // Usually the present file has the position. The directory may be large, and is not read then.
    Member present;
    present.from = position.offset;
    if (named != nullptr && named->identity() == identityOf(position) &&
        named->holds(position, present.tail)) {
        found.holder = std::move(present);
        return true;
    }
    const std::vector<GenerationFile> files = generations({static_cast<ino_t>(position.inode)});
    bool vanished = false;
    found.holder = findHolder(position, search, named, files, vanished);
    if (vanished) {
        return false;
    }
    if (found.holder && named != nullptr && found.holder->file == nullptr) {
        return true; // the present file has the same contents
    }
    // Without a file that has the guard, an identity says nothing: inodes are used again.
    GenerationReference reference{std::nullopt, m_modified};
    if (found.holder) {
        reference.identity = found.holder->file->identity();
        Generation::Status status;
        reference.modified = found.holder->file->status(status) ? status.modified : 0;
    }
    return openYounger(reference, files, named, found);
}

/// The file that has the position: another than `named` with its identity, else one with the same
/// contents. A member without a file stands for `named`.
std::optional<FileFollower::Member>
FileFollower::findHolder(const LogPosition& position, Search search, Generation* named,
                         const std::vector<GenerationFile>& files, bool& vanished) {
    const FileIdentity wanted = identityOf(position);
    Member member;
    member.from = position.offset;
    const auto opens = [&](const GenerationFile& file) {
        member.file = Generation::open(file.path);
        if (hasVanished(member.file.get(), file)) {
            vanished = true;
            return false;
        }
        return member.file && member.file->holds(position, member.tail);
    };
    // Without bytes before the position, a file that was written to since may be another one that
    // has the same inode. It is read by its age. A compressed one is another, whatever its time,
    // which is that of the file that was compressed.
    const auto isSure = [&position](const GenerationFile& file) {
        return position.guardLength > 0 ||
               (!file.isCompressed &&
                (position.modified == 0 || file.modified <= position.modified));
    };
    for (const GenerationFile& file : files) {
        if (file.identity == wanted && isSure(file) && !isKnown(file.identity, named) &&
            m_owner.take(file.identity) && opens(file)) {
            return member;
        }
    }
    if (search == Search::byIdentity || position.guardLength == 0) {
        return std::nullopt;
    }
    member.file.reset();
    if (named != nullptr && named->holds(position, member.tail)) {
        return member;
    }
    std::vector<GenerationFile> others = files;
    std::sort(others.begin(), others.end(), isBetterHolder);
    for (const GenerationFile& file : others) {
        if (!isKnown(file.identity, named) && m_owner.take(file.identity) && opens(file)) {
            return member;
        }
    }
    return std::nullopt;
}

/// Opens the generations after the reference that are not copies of other files. False if one has
/// vanished.
bool FileFollower::openYounger(const GenerationReference& reference,
                               const std::vector<GenerationFile>& files, Generation* named,
                               Found& found) {
    std::vector<Member> candidates;
    for (const GenerationFile& file : youngerThan(files, reference)) {
        if (isKnown(file.identity, named) || m_late.has(file.identity) || isCountedLost(file) ||
            !m_owner.take(file.identity)) {
            continue;
        }
        if (candidates.size() == mostOpen) {
            found.isAll = false;
            break;
        }
        Member member;
        member.file = Generation::open(file.path);
        int number = member.file ? 0 : errno;
        if (hasVanished(member.file.get(), file)) {
            return false;
        }
        // The file of the position may have been written to after it was read.
        Tail tail;
        const bool isRead = member.file && m_hasPosition && !m_isInBlock && m_position.offset > 0 &&
                            file.identity == identityOf(m_position) &&
                            member.file->holds(m_position, tail);
        // Empty ones do not count: the files after them would never be reached.
        char first;
        const std::ptrdiff_t count = member.file && !isRead ? member.file->readAt(&first, 1, 0) : 0;
        if (count > 0) {
            beginWhereLeft(member);
            candidates.push_back(std::move(member));
            continue;
        }
        number = count < 0 ? errno : number;
        if (number != 0 && number != ENOENT) {
            noteUnreadable({file, count < 0 ? "read" : "open", number}, files, found);
        }
        if (found.awaited) {
            break;
        }
    }
    // A copy that was made without a truncation, or a compressed file beside the original.
    const auto isCopy = [&](Member& member) {
        const auto isOf = [&member](Generation* other) {
            return other != nullptr && member.file->isCopyOf(*other);
        };
        return isOf(named) || (found.holder && isOf(found.holder->file.get())) ||
               m_late.hasOriginalOf(*member.file) ||
               std::any_of(m_chain.begin(), m_chain.end(),
                           [&](const Member& known) { return isOf(known.file.get()); }) ||
               std::any_of(candidates.begin(), candidates.end(), [&](const Member& other) {
                   return &other != &member && isOf(other.file.get());
               });
    };
    for (auto member = candidates.begin(); member != candidates.end();) {
        member = isCopy(*member) ? candidates.erase(member) : member + 1;
    }
    found.younger = std::move(candidates);
    return true;
}

} // namespace zrm
