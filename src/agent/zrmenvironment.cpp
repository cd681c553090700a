// The process's environment at start-up: the settings that the agent takes from it, and the system
// limits that it traces.

#include "agent/zrmmain.h"
#include "base/ErrorText.h"
#include "base/ProcessValues.h"
#include "base/TraceScope.h"

#include <cerrno>
#include <clocale>
#include <cstdlib>

#include <unistd.h>

namespace zrm {

namespace {

TRC1_Anchor anchor{"zrmenvironment.cpp"};

constexpr std::int32_t defaultMaxRows = 1000;
constexpr long displayedPosixVersion = 199506;
constexpr long displayedPathMax = 1024;
constexpr const char* constantDisplayed = ">> constant displayed <<";

enum class Source { CONSTANT, SYSCONF };

/// One system limit: a constant or the value of a selector. Formats of constants take an int, the
/// others a long and a text.
struct Limit {
    const char* format;
    Source source;
    int value; ///< the constant or the selector
};

constexpr Limit posixVersion{"\nPOSIX_VERSION\t\t= %ld\tPOSIX version. %s", Source::SYSCONF,
                             _SC_VERSION};

constexpr Limit systemLimits[] = {
    {"\nCHAR_BIT\t\t= %d\tNo. of bits per char.", Source::CONSTANT, 8},
    {"\nINT_MAX\t\t\t= %d\tMax. value of int.", Source::CONSTANT, 2147483647},
    // The format shows the low half of the number.
    {"\nLONG_MAX\t\t= %d\tMax. value of long.", Source::CONSTANT,
     static_cast<int>(9223372036854775807LL)},
    {"\nTHREADS\t\t\t= %ld\tThread support provided. %s", Source::SYSCONF, _SC_THREADS},
    {"\nTHREAD_THREADS_MAX\t= %ld\tMax. no. threads per process. %s", Source::SYSCONF,
     _SC_THREAD_THREADS_MAX},
    {"\nSYS1_PTHREAD_DRAFT\t= %d\tPOSIX thread draft.", Source::CONSTANT, 199506},
    {"\nARG_MAX\t\t\t= %ld\tMax. length of args to exec(). %s", Source::SYSCONF, _SC_ARG_MAX},
    {"\nCHILD_MAX\t\t= %ld\tMax. no. processes per real uid. %s", Source::SYSCONF, _SC_CHILD_MAX},
    {"\nOPEN_MAX\t\t= %ld\tMax. no. open files per process. %s", Source::SYSCONF, _SC_OPEN_MAX},
    {"\nSTREAM_MAX\t\t= %ld\tMax. no. std. i/o streams per process. %s", Source::SYSCONF,
     _SC_STREAM_MAX},
    {"\nSAVED_IDS\t\t= %ld\tImplementation support for saved set-id's. %s", Source::SYSCONF,
     _SC_SAVED_IDS},
    {"\nCLK_TCK\t\t\t= %ld\tNo. of clock ticks per second. %s", Source::SYSCONF, _SC_CLK_TCK},
};

/// One limit of the current directory's file system.
struct PathLimit {
    const char* format;
    int name;
};

constexpr PathLimit pathMax{"\nPATH_MAX\t\t= %ld\tMax. length of relative pathname. %s",
                            _PC_PATH_MAX};

constexpr PathLimit pathLimits[] = {
    {"\nNAME_MAX\t\t= %ld\tMax. length of filename. %s", _PC_NAME_MAX},
    {"\nLINK_MAX\t\t= %ld\tMax. value of cwd's link count. %s", _PC_LINK_MAX},
    {"\nPIPE_BUF\t\t= %ld\tMax. bytes that can be written atomically to a pipe. %s", _PC_PIPE_BUF},
    {"\nCHOWN_RESTRICTED\t= %ld\tRestricted use of chown. %s", _PC_CHOWN_RESTRICTED},
};

/// Reads the report row limit from the environment. Returns false if the default applies.
bool takeMaxRows(const TraceScope& trace) {
    constexpr const char* variable = "ZRM_MAX_ROWS";
    const char* const text = std::getenv(variable);
    if (text == nullptr || *text == '\0') {
        return false;
    }
    // Like atoi, but with a defined result for numbers out of range.
    gMaxRows = static_cast<std::int32_t>(std::strtol(text, nullptr, 10));
    if (gMaxRows <= 0) {
        trace.error()("Error converting %s value of %s to integer; using default value.", variable,
                      text);
        return false;
    }
    trace.detail()("Maximum Log Entries report rows set to %d.", gMaxRows);
    return true;
}

void printSystemLimits(const TraceScope& trace) {
    if (printSysconfLimit(posixVersion.format, posixVersion.value) < 0) {
        trace.always()(posixVersion.format, displayedPosixVersion, constantDisplayed);
    }
    for (const Limit& limit : systemLimits) {
        if (limit.source == Source::CONSTANT) {
            trace.always()(limit.format, limit.value);
        } else {
            printSysconfLimit(limit.format, limit.value);
        }
    }
}

void printPathLimits(const TraceScope& trace) {
    char cwd[1024];
    if (::getcwd(cwd, sizeof cwd) == nullptr) {
        const ErrorText error(errno);
        trace.error()("Error calling getcwd(); array size is %d. errno = %d; %s",
                      static_cast<int>(sizeof cwd + 1), error.number(), error.text());
        return;
    }
    trace.detail()("Current working directory is %s. The following limits apply to the cwd and to "
                   "the specific file system to which it belongs.",
                   cwd);
    if (printPathconfLimit(pathMax.format, pathMax.name, cwd) < 0) {
        trace.always()(pathMax.format, displayedPathMax, constantDisplayed);
    }
    for (const PathLimit& limit : pathLimits) {
        printPathconfLimit(limit.format, limit.name, cwd);
    }
}

/// Sets the process's locale from the environment.
const char* setLocale() {
    const char* const categories = std::setlocale(LC_ALL, "");
    return categories != nullptr ? categories : "unknown";
}

/// Traces one limit. `call` names the system call; `noValue` describes a value it does not have.
long printLimit(const TraceScope& trace, const char* format, long value, int error, int name,
                const char* call, const char* noValue) {
    const char* suffix = "";
    if (value < 0 && error != 0) {
        const ErrorText text(error);
        trace.error()("Error calling %s() for limit %d.  errno = %d; %s", call, name, text.number(),
                      text.text());
        suffix = ">> Error <<";
    } else if (value < 0) {
        suffix = noValue;
    }
    trace.always()(format, value, suffix);
    return value;
}

} // namespace

void checkEnvironment() {
    TraceScope trace(anchor);
    constexpr const char* traceVariable = "QFW_TRC1";
    if (const char* const configuration = std::getenv(traceVariable)) {
        trace.always()("%s = %s", traceVariable, configuration);
    } else {
        trace.always()("%s is not defined.", traceVariable);
    }
    if (!takeMaxRows(trace)) {
        gMaxRows = defaultMaxRows;
        trace.detail()("Maximum Log Entries report rows set to default of %d.", gMaxRows);
    }
    if (!trace.isOn(TRC1_DETAIL)) {
        setLocale();
        return;
    }
    printSystemLimits(trace);
    printPathLimits(trace);
    trace.detail()("Current locale categories are %s.", std::setlocale(LC_ALL, nullptr));
    trace.detail()("New locale categories are %s.", setLocale());
}

long printSysconfLimit(const char* format, int name) {
    TraceScope trace(anchor);
    errno = 0;
    const long value = ::sysconf(name);
    return trace.result(
        printLimit(trace, format, value, errno, name, "sysconf", ">> Undefined <<"));
}

long printPathconfLimit(const char* format, int name, const char* path) {
    TraceScope trace(anchor);
    errno = 0;
    const long value = ::pathconf(path, name);
    return trace.result(
        printLimit(trace, format, value, errno, name, "pathconf", ">> No limit <<"));
}

} // namespace zrm
