#ifndef ZRM_SOURCE_LOG_FILE_H
#define ZRM_SOURCE_LOG_FILE_H

#include "logs/EntrySource.h"
#include "logtypes/EntryStamp.h"
#include "monitor/LogFile.h"

#include <string>
#include <string_view>

namespace zrm {

class LogPositions;
class SourceEntry;

/// A log that is not a file: its entries come from the source of its settings. Each is judged once,
/// and the position behind it is stored with its events. A source that fails is never given up.
/// Monitoring starts on construction. Threads as in LogFile.
class SourceLogFile : public LogFile {
public:
    static constexpr char journalLetter = 'J';
    static constexpr char commandLetter = 'C';

    /// The log has follow settings with a source.
    SourceLogFile(const ValidLog& log, LogFile* chainHead);
    using LogFile::operator=;
    ~SourceLogFile() override;

    void endReportRequest(void** reportState) override;
    void* getNextLogEntry(void* row, void* reportState, void* thresholds) override;
    /// Returns null if the source has no past or cannot be read.
    void* startReportRequest(void* thresholds) override;
    /// Fills the row from the entry that the log's source has given last. Returns 0, or -1 if the
    /// entry does not fit the source's format. Log's thread only.
    long formatEntryAsRow(char* entry, void* row, void* context) override;
    void processLogData() override;
    std::string_view rejectionReason() const noexcept override;

    /// Makes a row of an entry. False if the entry does not fit the source's format. Any thread;
    /// the entry and `stamp` are its own.
    bool makeRow(EntrySource::Entry& entry, EntryStamp& stamp, zrm_rmlogent_data_t& row);

protected:
    /// Creates a log that is not monitored and starts no thread.
    struct Unmonitored {};
    SourceLogFile(const ValidLog& log, Unmonitored);

private:
    struct Report;

    void begin(const FollowSettings& settings, LogPositions& positions);
    void recount(const std::string& position);
    bool readEntries(LogPositions& positions, SourceEntry& current);
    static void reach(LogPositions& positions, std::string position);
    void noteState();

    // Used by the log's thread only.
    EntrySource::Reading* m_reading = nullptr;
    EntryStamp m_stamp{followSettings()};
    std::string m_problem; ///< as traced last
};

} // namespace zrm

#endif
