#ifndef ZRM_HOST_JOURNAL_FILES_H
#define ZRM_HOST_JOURNAL_FILES_H

#include <cstdint>
#include <set>
#include <string>
#include <vector>

namespace zrm::host {

/// The files of a journal, and which of them cannot be read. Any thread.
struct JournalFiles {
    struct File {
        std::string path;
        std::int64_t size = 0; ///< bytes
        std::string problem;   ///< why it cannot be read, as a clause; empty if it can
    };

    /// The directories in which this machine's journal is: the persistent and the volatile one.
    static std::vector<std::string> directories();

    /// Looks at the files in the directory and in those below it, or at this machine's if it is
    /// empty. `known`: files that were looked at before; their contents are not examined again.
    static JournalFiles look(const std::string& directory, const std::set<std::string>& known = {});

    bool isReadable() const noexcept;
    /// What keeps the journal from being read, as a clause; empty if any of it can be.
    std::string problem() const;

    std::vector<File> files;
    std::vector<std::string> searched; ///< directories that were looked into
    std::string unreadable;            ///< a directory that cannot be read, with the reason
};

} // namespace zrm::host

#endif
