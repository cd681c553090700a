#include "logtypes/UserLogFile.h"

#include "base/ErrorText.h"
#include "base/LockGuard.h"
#include "base/TraceScope.h"
#include "logs/ValidLog.h"
#include "logs/zrm_rmlogent_data.h"
#include "logtypes/EntryTime.h"
#include "parser/StringParser.h"

#include <cerrno>
#include <iterator>
#include <new>
#include <utility>

namespace zrm {

namespace {

TRC1_Anchor anchor{"UserLogFile.cpp"};

/// The fields of a user log, in the order of the format buffers in formatEntryAsRow.
constexpr _KeywordFields validFields[] = {
    {"year", 2},   {"month", 2},  {"day", 2},  {"hour", 2},  {"minute", 2},      {"second", 2},
    {"system", 2}, {"source", 2}, {"type", 2}, {"class", 2}, {"description", 2}, {nullptr, 0},
};

constexpr _KeywordFields validFollowedFields[] = {
    {"year", 2},        {"month", 2},  {"day", 2},    {"hour", 2}, {"minute", 2},
    {"second", 2},      {"system", 2}, {"source", 2}, {"type", 2}, {"class", 2},
    {"description", 2}, {"zone", 2},   {nullptr, 0},
};

} // namespace

UserLogFile::UserLogFile(const ValidLog& log, LogFile* chainHead) : LogFile(log, chainHead) {
    TraceScope trace(anchor);
    if (trace.isOn(TRC1_DETAIL)) {
        printSelf();
    }
    startThread();
}

UserLogFile::UserLogFile(const ValidLog& log, Unmonitored) : LogFile(log, nullptr) {
    const TraceScope trace(anchor);
}

UserLogFile::~UserLogFile() {
    TraceScope trace(anchor);
    stopThread();
}

void UserLogFile::printSelf() const {
    TraceScope trace(anchor);
    LogFile::printSelf();
    const LockGuard guard(&m_chainLock);
    trace.always()("\n\tSPAnchor\t\t= %p\n\tNumericMonth\t\t= %d\n",
                   static_cast<const void*>(SPAnchor.get()), NumericMonth ? 1 : 0);
}

void UserLogFile::processLogData() {
    TraceScope trace(anchor);
    if (!hasFormat()) {
        learnFormat();
    }
    if (!hasFormat()) {
        return;
    }
    if (isFollowed()) {
        followLog(0);
        return;
    }
    openLogAndSeek();
    if (LogFileP != nullptr) {
        waitForEventLoop({1, 0});
        closeLog();
    }
}

const _KeywordFields* UserLogFile::fields() noexcept {
    return validFields;
}

const _KeywordFields* UserLogFile::followedFields() noexcept {
    return validFollowedFields;
}

bool UserLogFile::hasFormat() const {
    const LockGuard guard(&m_chainLock);
    return SPAnchor != nullptr;
}

void UserLogFile::learnFormat() {
    TraceScope trace(anchor);
    std::unique_ptr<StringParser> format(new (std::nothrow) StringParser(
        procedure(), followSettings() != nullptr ? validFollowedFields : validFields));
    if (!format) {
        const ErrorText error(errno);
        trace.error()("Error: memory allocation failed for %d bytes; monitoring not started for "
                      "file %s. errno = %d; %s",
                      static_cast<int>(sizeof(StringParser)), fileNameLocal(), error.number(),
                      error.text());
        setMonitorStatus(MONITOR_ERR_NO_MEMORY);
        return;
    }
    if (format->status() != OBJECT_FORMAT_LEARNED) {
        format.reset();
        trace.error()("Error occurred while interpreting format command for file %s; monitoring "
                      "not started. ",
                      fileNameLocal());
        setMonitorStatus(MONITOR_ERR_FORMAT);
        return;
    }
    const LockGuard guard(&m_chainLock);
    SPAnchor = std::move(format);
}

long UserLogFile::formatEntryAsRow(char* line, void* row, void* reportContext) {
    TraceScope trace(anchor);
    EntryRow columns(*this, row);
    _EntryTimeBuffers times{};
    _FormatBuffer buffers[] = {
        {times.year, _EntryTimeBuffers::room},
        {times.month, _EntryTimeBuffers::room},
        {times.day, _EntryTimeBuffers::room},
        {times.hour, _EntryTimeBuffers::room},
        {times.minute, _EntryTimeBuffers::room},
        {times.second, _EntryTimeBuffers::room},
        {columns->entrysys, sizeof columns->entrysys},
        {columns->entrysrc, sizeof columns->entrysrc},
        {columns->entrytype, sizeof columns->entrytype},
        {columns->entryclass, sizeof columns->entryclass},
        {columns->entrydesc, sizeof columns->entrydesc},
        {times.zone, _EntryTimeBuffers::zoneRoom},
    };
    static_assert(std::size(buffers) == std::size(validFollowedFields) - 1);
    {
        const LockGuard guard(&m_chainLock);
        if (!SPAnchor || SPAnchor->formatLine(line, buffers) < 1 ||
            formatEntryTime(columns->entrytime, &times, reportContext) != 0) {
            columns.reject();
            return trace.result(-1L);
        }
    }
    columnToUTF8(columns->uentrysrc, columns->entrysrc);
    const std::int32_t lengthInUTF8 = columnToUTF8(columns->uentrydesc, columns->entrydesc);
    const _FormatBuffer& description = *(std::end(buffers) - 2);
    columns.setDescriptionLengths(
        static_cast<std::size_t>(description.position - columns->entrydesc), lengthInUTF8);
    return trace.result(0L);
}

} // namespace zrm
