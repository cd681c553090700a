#ifndef ZRM_FOLLOWED_REPORT_H
#define ZRM_FOLLOWED_REPORT_H

#include "logs/zrm_rmlogent_data.h"
#include "monitor/FileIdentity.h"
#include "monitor/Generation.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm {

class EntryReader;
class LineJoin;

/// Reads a followed log for a report: the file that has its name and its older generations, the
/// newest entry first. A line that does not fit, or a file that cannot be read, does not end it. A
/// generation of which only the beginning shows that it has nothing between the two times is not
/// read any further, and none that is older than the first time is opened. Compressed generations
/// are read once, from their beginning on, and only the rows that may be given are kept; one whose
/// contents a younger file has is a copy, and is not read. Memory is bounded whatever the files
/// have: where the details of a compressed file's rows need more, the report ends with that file.
/// One thread; ends when its request does (CTX1_IsCancelled).
class FollowedReport {
public:
    /// Bytes of details that wait with their rows while a compressed file is read.
    static constexpr std::size_t mostDetails = 32 * 1024 * 1024;

    /// What a receiver wants to have of an entry beside its row.
    struct Detail {
        std::string text = {};
        bool isCut = false;
    };

    /// What the report asks of its caller and gives to it.
    class Receiver {
    public:
        virtual ~Receiver() = default;
        /// A file is read next: the newest entry first, or the oldest first.
        virtual void begin(bool /*isOldestFirst*/) {}
        /// Whether a row between the two times meets the conditions of the report. Its entry is
        /// that of the thread (LogEntry).
        virtual bool meets(zrm_rmlogent_data_t& row) = 0;
        /// Called after `meets` of a row that does, while its entry is that of the thread.
        virtual Detail describe() { return {}; }
        /// The next row, with what `describe` has returned of it; rows come newest first.
        virtual void give(const zrm_rmlogent_data_t& row, const Detail& detail) = 0;
        /// Called after each block: how many of all bytes of the files were read or passed over.
        virtual void progress(std::int64_t read, std::int64_t total) = 0;
    };

    struct Options {
        std::string from; ///< time stamp of 16 characters, as `to`
        std::string to;
        std::size_t limit = 1;                          ///< rows, at least 1
        std::string rotatedTo = {};                     ///< see FollowSettings
        std::shared_ptr<const LineJoin> join = nullptr; ///< which lines make an entry
    };

    struct File {
        std::string path;
        std::int64_t size = 0;                ///< bytes
        std::optional<FileIdentity> identity; ///< of an older generation
        bool isRead = false;                  ///< false: nothing between the two times, or a copy
        std::string problem;                  ///< why not all of it was read, as a clause
    };

    /// `path` is in the local code page. `entries` outlives the object.
    FollowedReport(std::string path, EntryReader& entries, Options options);

    void run(Receiver& receiver);

    /// The files that were there when the report began, the newest first.
    const std::vector<File>& files() const noexcept { return m_files; }
    /// Lines that are not entries, in what was read.
    std::uint64_t skipped() const noexcept { return m_skipped; }
    /// True if the limit ended the report; there may be more rows.
    bool isLimited() const noexcept { return m_given == m_options.limit; }
    bool isCancelled() const noexcept { return m_isCancelled; }
    /// ENTRYTIME of the oldest entry between the two times, or empty if there was none.
    const std::string& reached() const noexcept { return m_reached; }

private:
    enum class Place : unsigned char { unfit, tooNew, within, tooOld, farTooOld, farTooNew };

    void findFiles();
    bool readFile(File& file, Receiver& receiver);
    std::unique_ptr<Generation> open(File& file);
    bool isCopy(Generation& older);
    /// Time stamps; empty if there is no entry.
    struct FirstTimes {
        std::string earliest;
        std::string latest;
    };
    FirstTimes firstTimes(Generation& generation);
    void readBackward(Generation& generation, File& file, Receiver& receiver);
    void readForward(Generation& generation, File& file, Receiver& receiver);
    bool isEnded();
    Place place(char* entry, std::string_view text, const std::string& newest);
    static bool isFar(Place where, Place farPlace, unsigned& far) noexcept;
    void give(const zrm_rmlogent_data_t& row, const Detail& detail, Receiver& receiver);
    void show(std::int64_t read, Receiver& receiver);

    const std::string m_path;
    EntryReader& m_entries;
    const Options m_options;
    const std::string m_longBefore; ///< older entries end the reading of a file
    const std::string m_longAfter;

    std::vector<File> m_files;
    std::unique_ptr<Generation> m_present; ///< opened before the older generations are looked for
    std::unique_ptr<Generation> m_younger; ///< the plain file that was read last
    std::string m_newest;                  ///< no entry that is still to be read is much newer
    std::int64_t m_done = 0;               ///< bytes of the files before the one that is read
    std::int64_t m_read = 0;               ///< bytes read so far, as the receiver knows
    std::int64_t m_total = 0;
    std::size_t m_given = 0;
    std::uint64_t m_skipped = 0;
    bool m_isCancelled = false;
    bool m_isFull = false; ///< the details left no room for older rows
    std::string m_reached;
    zrm_rmlogent_data_t m_row{};
};

} // namespace zrm

#endif
