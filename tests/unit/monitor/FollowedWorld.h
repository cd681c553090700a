#ifndef ZRM_TESTS_FOLLOWED_WORLD_H
#define ZRM_TESTS_FOLLOWED_WORLD_H

#include "support/TemporaryDirectory.h"

#include <map>
#include <memory>
#include <random>
#include <set>
#include <string>
#include <vector>

#include <sys/types.h>

/// A log that one program writes and others rotate, with a plain account of which entries were
/// written where. Every entry's text begins with its number; further lines begin with a blank.
/// Times of modification are set, so that everything that is done has a time of its own.
class FollowedWorld {
public:
    enum class Style { NUMBERED, DATED, SYMLINK };
    struct Entry {
        std::string text;       ///< without the last newline
        bool mayMiss = false;   ///< it was gone before anyone could read it
        bool isInParts = false; ///< it was not written at once
    };
    /// An entry of a program that was not told of a rotation. Its text begins with "L" and its
    /// number among these.
    struct LateEntry {
        std::string text;
        int file; ///< the number of the rotation
        bool mayMiss = false;
    };
    /// A file, whatever its name.
    struct File {
        std::vector<int> entries;
        std::vector<int> lateEntries{};
        bool isUnknown = false;   ///< no follower can know that it is the log's
        bool isOpenEnded = false; ///< the last entry has no newline yet
    };

    using Files = std::set<std::shared_ptr<File>>;

    /// `mostLines`: of an entry.
    FollowedWorld(Style style, unsigned mostLines, std::mt19937& random);
    ~FollowedWorld();

    const std::string& path() const { return m_path; }
    const std::vector<Entry>& entries() const { return m_entries; }
    const std::vector<LateEntry>& lateEntries() const { return m_lateEntries; }

    void write(int lines);
    void writeLongLine();
    void writeHalf();
    /// Some lines to the file that was rotated last, if a program still has it open. One that
    /// writes to older ones makes the times of modification contradict the order of the files.
    void writeLate();
    void rotateByName(bool creates);
    void reopen();
    void copyAndTruncate(bool losesLines);
    void truncate();
    void compress();
    void removeGeneration();
    /// Not while a late writer's file is younger than the log: then only times say which of two
    /// files was rotated first.
    void removeAndCreate();
    void replace();

    /// Which file has which entries, on standard error.
    void print() const;

    bool isReopenDue() const { return m_isReopenDue; }
    /// The follower has the file that has the name now.
    void noteLook();
    /// The follower has ended; `last` is the last entry before its position, -1 if there is none.
    void noteEnd(int last);
    /// A follower begins at the position of the one that ended, if that had one, which has these
    /// files besides.
    void noteStart(bool hasPosition, const Files& lateFiles);
    /// The file that a follower holds; null if it never had the log's name at a look.
    std::shared_ptr<File> fileAt(ino_t inode) const;
    /// What was delivered last.
    void noteDelivered(int last) { m_delivered = last; }

private:
    std::string random(std::size_t most);
    std::string furtherLines();
    void append(int descriptor, const std::string& text);
    void append(const std::string& text) { append(m_descriptor, text); }
    void leaveLateWriter();
    void endLateWriter();
    void touch(const std::string& path);
    void shift();
    std::string rotatedName();
    void create();
    bool has(const File& file, int entry) const;
    void findMissing();
    void findMissingLate();
    bool hasContradictingTime() const;

    const Style m_style;
    const unsigned m_mostLines;
    std::mt19937& m_random;
    TemporaryDirectory m_directory;
    std::string m_path;
    std::vector<Entry> m_entries;
    std::map<std::string, std::shared_ptr<File>> m_files; ///< by path; a link's target
    Files m_held;                                         ///< by the follower
    std::map<ino_t, std::shared_ptr<File>> m_seen;        ///< at looks
    std::shared_ptr<File> m_written;
    std::string m_target; ///< of the symbolic link
    int m_descriptor = -1;
    std::vector<LateEntry> m_lateEntries;
    std::shared_ptr<File> m_lateFile; ///< that a program still writes
    int m_lateDescriptor = -1;
    int m_rotations = 0;
    std::shared_ptr<File> m_rotatedLast; ///< by renaming, if nothing was copied since
    bool m_isReopenDue = false;
    int m_delivered = -1;
    int m_last = -1; ///< before the position of an ended follower; -2: none has ended
    bool m_isFollowed = false;
    int m_names = 0;
    long m_tick = 0;
};

#endif
