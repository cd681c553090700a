#ifndef ZRM_FORMAT_LOG_FILE_H
#define ZRM_FORMAT_LOG_FILE_H

#include "logs/EntryFormat.h"
#include "logs/FollowSettings.h"
#include "logtypes/EntryStamp.h"
#include "monitor/LogFile.h"

#include <cstddef>
#include <memory>
#include <string_view>
#include <utility>

namespace zrm {

/// A followed log whose entries are taken apart by a format that the framework brings
/// (FollowSettings::format). Monitoring starts on construction. Threads as in LogFile.
class FormatLogFile : public LogFile {
public:
    static constexpr char typeLetter = 'F';

    /// The log has follow settings with a format.
    FormatLogFile(const ValidLog& log, LogFile* chainHead);
    using LogFile::operator=;
    ~FormatLogFile() override;

    void endReportRequest(void** reportState) override;
    /// Reads the file that has the log's name. A line that does not fit the format is passed over.
    void* getNextLogEntry(void* row, void* reportState, void* thresholds) override;
    /// Returns null if the log cannot be read.
    void* startReportRequest(void* thresholds) override;
    /// Returns 0, or -1 for an entry that does not fit the format. `entry` is a terminated line, of
    /// which the thread's LogEntry has the whole text if it has any, or a record. Any thread.
    long formatEntryAsRow(char* entry, void* row, void* context) override;
    void processLogData() override;
    bool deliverEntry(char* entry) override;
    void readFields(std::string_view text, EntryFields& fields) const override;
    std::string_view rejectionReason() const noexcept override;

    /// What takes a log's entries apart. One thread.
    struct Parser {
        explicit Parser(std::shared_ptr<const FollowSettings> follow)
            : settings(std::move(follow)), reader(settings->format->reader()), stamp(settings) {}

        const std::shared_ptr<const FollowSettings> settings;
        const std::unique_ptr<EntryFormat::Reader> reader;
        EntryStamp stamp;
    };
    /// Makes a row of an entry's whole text, or of a record. `newest` as in EntryReader; null while
    /// monitoring. False if the entry does not fit the format. Any thread.
    bool makeRow(Parser& parser, std::string_view entry, const char* newest,
                 zrm_rmlogent_data_t& row);
    const EntryFormat& format() const noexcept { return *followSettings()->format.value; }

protected:
    /// Creates a log that is not monitored and starts no thread.
    struct Unmonitored {};
    FormatLogFile(const ValidLog& log, Unmonitored);

private:
    struct Report;

    Parser& parserOfThread() const;
    std::string_view wholeEntry(const char* entry) const;
};

} // namespace zrm

#endif
