#include "logtypes/createLogFile.h"

#include "logs/ValidLog.h"
#include "logtypes/AdminLogFile.h"
#include "logtypes/ErrLogFile.h"
#include "logtypes/FormatLogFile.h"
#include "logtypes/SourceLogFile.h"
#include "logtypes/SysLogFile.h"
#include "logtypes/UserLogFile.h"

#include <new>

namespace zrm {

namespace {

template <typename Kind> LogFile* create(const ValidLog& log, LogFile* chainHead) {
    return new (std::nothrow) Kind(log, chainHead);
}

struct LogKind {
    char letter;
    LogFile* (*create)(const ValidLog& log, LogFile* chainHead);
};

constexpr LogKind logKinds[] = {
    {'S', create<SysLogFile>},
    {'U', create<UserLogFile>},
    {'A', create<AdminLogFile>},
    {'E', create<ErrLogFile>},
    // No line of the log configuration says these.
    {FormatLogFile::typeLetter, create<FormatLogFile>},
    {SourceLogFile::journalLetter, create<SourceLogFile>},
    {SourceLogFile::commandLetter, create<SourceLogFile>},
};

const LogKind* findKind(char type) noexcept {
    for (const LogKind& kind : logKinds) {
        if (kind.letter == type) {
            return &kind;
        }
    }
    return nullptr;
}

} // namespace

bool isKnownLogType(char type) noexcept {
    return findKind(type) != nullptr;
}

LogFile* createLogFile(const ValidLog& log, LogFile* chainHead) {
    return findKind(log.type())->create(log, chainHead);
}

} // namespace zrm
