#ifndef ZRM_GENERATION_NAMES_H
#define ZRM_GENERATION_NAMES_H

#include "monitor/FileIdentity.h"

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm {

/// True if the name ends like that of a compressed file.
bool isCompressedName(std::string_view name) noexcept;

/// What a file's name says about its place among the generations of a log.
struct GenerationName {
    enum class Scheme : unsigned char {
        numbered, ///< log.1, log.2.gz: the higher, the older
        dated,    ///< log-20261119, log.2026-11-19.xz: the higher, the younger
        plain,    ///< log.old
        other,    ///< begins with the log's name, but is not known to be a generation
    };

    Scheme scheme = Scheme::other;
    std::uint64_t number = 0;
    int digits = 0; ///< of a date

    /// None if the name has nothing to do with the log's.
    static std::optional<GenerationName> parse(std::string_view name, std::string_view log);
};

/// A file beside a log whose name begins like the log's.
struct GenerationFile {
    std::string path;
    FileIdentity identity;
    std::int64_t modified; ///< ns since the epoch
    std::int64_t size;
    GenerationName name;
    bool isCompressed;
};

/// The directory, with a slash at its end, to which rotation moves the log's older files, given
/// what FollowSettings says of it. Empty if that is empty.
std::string rotationDirectory(const std::string& logPath, const std::string& rotatedTo);

/// The regular files beside the log, and where rotation moves them, whose names begin with the
/// log's, without the log itself, and those with the inodes, whatever their names; at most 10,000.
std::vector<GenerationFile> findGenerations(const std::string& logPath,
                                            const std::vector<ino_t>& inodes = {},
                                            const std::string& rotatedTo = {});

/// The last generation that was read.
struct GenerationReference {
    std::optional<FileIdentity> identity; ///< if it is one of the files
    std::int64_t modified = 0;            ///< ns since the epoch
};

/// The generations among the files that are younger than the reference, the oldest first. Their
/// names decide if the reference has one, and if all names follow the same scheme; else the times
/// of last modification do. Names of one scheme decide the order in any case. Compressed files come
/// before a plain one of the same name.
std::vector<GenerationFile> youngerThan(const std::vector<GenerationFile>& files,
                                        const GenerationReference& reference);

/// The generations among the files, the newest first: by their names if all follow the same scheme,
/// else by the times of last modification. A compressed file beside a plain one of the same name is
/// its copy and left out.
std::vector<GenerationFile> newestFirst(std::vector<GenerationFile> files);

} // namespace zrm

#endif
