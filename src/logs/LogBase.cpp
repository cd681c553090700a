#include "logs/LogBase.h"

#include "base/TraceScope.h"
#include "base/UTF8Conv.h"
#include "logs/FollowSettings.h"

#include <cstdlib>
#include <cstring>
#include <new>
#include <string_view>

namespace zrm {

namespace {

TRC1_Anchor anchor{"LogBase.cpp"};

/// A zeroed character array. Ends the process if memory runs out.
std::unique_ptr<char[]> newText(const TraceScope& trace, std::size_t size) {
    std::unique_ptr<char[]> text(new (std::nothrow) char[size]());
    if (!text) {
        trace.error()("Memory allocation failed.  Agent is terminating.");
        std::exit(-1);
    }
    return text;
}

} // namespace

std::unique_ptr<char[]> newLogFileName(std::size_t& pathLength, const char* name) {
    TraceScope trace(anchor);
    const std::size_t length = std::strlen(name);
    std::unique_ptr<char[]> copy = newText(trace, length + 1);
    std::memcpy(copy.get(), name, length);
    const char* const lastSlash = std::strrchr(name, '/');
    if (lastSlash != nullptr) {
        pathLength = static_cast<std::size_t>(lastSlash - name) + 1;
    } else {
        trace.error()("No %c character found in file name %s.", '/', name);
        pathLength = 0;
    }
    return copy;
}

LogBase::LogBase(const LogBase& other) {
    TraceScope trace(anchor);
    LogFollowSettings = other.LogFollowSettings;
    if (other.isSource()) {
        setSourceName(other.fileNameUTF8());
    } else if (other.LogFileNameUTF8) {
        setLogFileName(other.LogFileNameUTF8.get(), 1);
    }
    LogPathNameLengthUTF8 = other.LogPathNameLengthUTF8;
    LogDebugMode.store(other.debugMode(), std::memory_order_relaxed);
    LogType = other.LogType;
    setLogProcedure(other.LogProcedure.get());
}

void LogBase::setLogFileName(const char* name, int isUTF8) {
    TraceScope trace(anchor);
    // The work buffers start zeroed. A conversion that is not possible leaves them unchanged.
    if (isUTF8 != 1) {
        LogFileNameLocal = newLogFileName(LogPathNameLengthLocal, name);
        const std::size_t length = std::strlen(LogFileNameLocal.get());
        const std::size_t size = 3 * length + 1;
        const std::unique_ptr<char[]> buffer = newText(trace, size);
        UTF8Conv::Convert_toUTF8(buffer.get(), size, LogFileNameLocal.get(), length, 0);
        LogFileNameUTF8 = newLogFileName(LogPathNameLengthUTF8, buffer.get());
    } else {
        LogFileNameUTF8 = newLogFileName(LogPathNameLengthUTF8, name);
        const std::size_t length = std::strlen(LogFileNameUTF8.get());
        const std::unique_ptr<char[]> buffer = newText(trace, length + 1);
        UTF8Conv::Convert_fromUTF8(buffer.get(), length + 1, LogFileNameUTF8.get(), length);
        LogFileNameLocal = newLogFileName(LogPathNameLengthLocal, buffer.get());
    }
}

void LogBase::setSourceName(const char* name) {
    TraceScope trace(anchor);
    const std::size_t size = std::strlen(name) + 1;
    for (auto* const field : {&LogFileNameUTF8, &LogFileNameLocal}) {
        *field = newText(trace, size);
        std::memcpy(field->get(), name, size);
    }
    LogPathNameLengthLocal = LogPathNameLengthUTF8 = 0;
}

bool LogBase::isSource() const noexcept {
    return LogFollowSettings != nullptr && LogFollowSettings->source;
}

bool LogBase::isNameKept(int isUTF8) const {
    TraceScope trace(anchor);
    const std::string_view nameUTF8 = fileNameUTF8();
    const std::string_view nameLocal = fileNameLocal();
    if (nameUTF8 == nameLocal || nameUTF8.empty() || nameLocal.empty()) {
        return trace.result(true);
    }
    const bool isBackToUTF8 = isUTF8 == 1;
    const std::string_view given = isBackToUTF8 ? nameUTF8 : nameLocal;
    const std::string_view converted = isBackToUTF8 ? nameLocal : nameUTF8;
    const std::size_t size = 3 * converted.size() + 1;
    const std::unique_ptr<char[]> buffer = newText(trace, size);
    if (isBackToUTF8) {
        UTF8Conv::Convert_toUTF8(buffer.get(), size, converted.data(), converted.size(), 0);
    } else {
        UTF8Conv::Convert_fromUTF8(buffer.get(), size, converted.data(), converted.size());
    }
    return trace.result(given == buffer.get());
}

void LogBase::setLogProcedure(const char* procedure) {
    TraceScope trace(anchor);
    if (procedure == nullptr) {
        LogProcedure.reset();
        return;
    }
    const std::size_t length = std::strlen(procedure);
    std::unique_ptr<char[]> copy = newText(trace, length + 1);
    std::memcpy(copy.get(), procedure, length);
    LogProcedure = std::move(copy);
}

void LogBase::addToChain(LogBase* head) {
    TraceScope trace(anchor);
    if (head == nullptr) {
        Next = this;
        Prev = this;
        return;
    }
    Next = head;
    Prev = head->Prev;
    head->Prev = this;
    Prev->Next = this;
}

void LogBase::removeFromChain() {
    TraceScope trace(anchor);
    Prev->Next = Next;
    Next->Prev = Prev;
}

void LogBase::printSelf() const {
    TraceScope trace(anchor);
    trace.always()("\n\tthis\t\t\t= %p\n\tNext\t\t\t= %p\n\tPrev\t\t\t= %p\n"
                   "\tLogFileNameUTF8\t\t= \"%s\"\n\tLogPathNameLengthUTF8\t= %ld\n"
                   "\tLogFileNameLocal\t= \"%s\"\n\tLogPathNameLengthLocal\t= %ld\n"
                   "\tLogDebugMode\t\t= %c\n\tLogType\t\t\t= %c\n\tLogProcedure\t\t= \"%s\"\n",
                   static_cast<const void*>(this), static_cast<void*>(Next),
                   static_cast<void*>(Prev), fileNameUTF8(),
                   static_cast<long>(LogPathNameLengthUTF8), fileNameLocal(),
                   static_cast<long>(LogPathNameLengthLocal), debugMode(), LogType, procedure());
}

} // namespace zrm
