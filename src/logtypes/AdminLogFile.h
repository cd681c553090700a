#ifndef ZRM_ADMIN_LOG_FILE_H
#define ZRM_ADMIN_LOG_FILE_H

#include "logtypes/QuarterHour.h"
#include "monitor/LogFile.h"

#include <cstddef>
#include <cstdint>

namespace zrm {

/// A login accounting log: a file of 40-byte binary records, one row each. Lifetime and threads are
/// those of every LogFile: the log's own thread follows the end of the file, and a report reads the
/// file backwards on its request's thread.
class AdminLogFile : public LogFile {
public:
    /// One record of the file. Texts are padded with NULs and not terminated if full. Numbers are
    /// in the byte order of the host that wrote them.
    struct utmp {
        char ut_user[8];
        char ut_id[4];
        char ut_line[12];
        std::int16_t ut_pid;
        std::int16_t ut_type;
        std::int16_t e_termination;
        std::int16_t e_exit;
        std::int64_t ut_time; ///< seconds since the epoch
    };
    static constexpr std::size_t recordLength = 40;

    AdminLogFile(const ValidLog& log, LogFile* chainHead);
    ~AdminLogFile() override;

    void endReportRequest(void** reportState) override;
    /// Returns the next older record within the window. Null at the first record older than the
    /// window and at the start of the file, which is traced as an incomplete record.
    void* getNextLogEntry(void* row, void* reportState, void* thresholds) override;
    /// The report's state is a _LogBufferInfo.
    void* startReportRequest(void* thresholds) override;
    /// Fills the row from the 40 bytes at `record`, which may be unaligned. Always returns 0.
    long formatEntryAsRow(char* record, void* row, void* context) override;
    void processLogData() override;
    /// Reads the records between LogEOF and the end of the file. Returns -1 on a read error or if
    /// the file ends within a record; the bytes of that record are lost.
    long readLog() override;
    bool deliverEntry(char* record) override;

    /// Copies the text for a record type, at most `room` bytes, without a terminator.
    static void fillEntryType(char* dest, unsigned long room, int type);
    /// Writes the description of a record, at most `room` bytes, without a terminator. UTF-8 if
    /// `toUTF8` is not 0, else the local code page.
    static void formatEntryDesc(char* dest, unsigned long room, const utmp* record, int toUTF8);

protected:
    /// Creates a log that is not monitored and starts no thread. Used to format records.
    struct Unmonitored {};
    AdminLogFile(const ValidLog& log, Unmonitored);

private:
    void openAdminLog();
    void closeAdminLog();
    bool allocateReportBuffers(_LogBufferInfo** reportState);
    static void deallocateReportBuffers(_LogBufferInfo** reportState);

    QuarterHour m_quarterHour; ///< used by the log's thread only
};

static_assert(sizeof(AdminLogFile::utmp) == AdminLogFile::recordLength);
static_assert(offsetof(AdminLogFile::utmp, ut_line) == 12);
static_assert(offsetof(AdminLogFile::utmp, ut_pid) == 24);
static_assert(offsetof(AdminLogFile::utmp, ut_time) == 32);

} // namespace zrm

#endif
