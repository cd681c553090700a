#ifndef ZRM_LOG_BASE_H
#define ZRM_LOG_BASE_H

#include <atomic>
#include <cstddef>
#include <memory>

namespace zrm {

/// Returns a heap copy of `name` and sets `pathLength` to the length of its directory part with
/// the last '/', 0 (and an error in the trace) when it has none. Ends the process when memory runs
/// out.
std::unique_ptr<char[]> newLogFileName(std::size_t& pathLength, const char* name);

/// What a line of the configuration and a monitored log share: the log's name in the local code
/// page (to open it) and in UTF-8 (to report it), its type, debug mode and procedure, and the links
/// of a circular chain that its owner heads. Not locked; the log manager's lock guards the chain.
class LogBase {
public:
    LogBase() = default;
    /// Copies names, type, debug mode and procedure; the copy is on no chain.
    LogBase(const LogBase& other);
    LogBase& operator=(const LogBase&) = delete;
    virtual ~LogBase() = default;

    /// Sets both names from one: UTF-8 when `isUTF8` is 1, else in the local code page.
    void setLogFileName(const char* name, int isUTF8);
    /// False when a conversion has cut the name or put other characters into it, so that the one
    /// name no longer stands for the file of the other: `isUTF8` says which one was given. A name
    /// that has no other form at all, as without a code page, is not such a case.
    bool isNameKept(int isUTF8) const;
    /// Stores a copy of the procedure; null stays null.
    void setLogProcedure(const char* procedure);
    /// Links this object in at the tail of the chain that `head` heads; null: a chain of one.
    void addToChain(LogBase* head);
    /// Unlinks this object; its own links stay. Not for a chain of one.
    void removeFromChain();
    /// Writes one trace record of all fields, whatever the level.
    void printSelf() const;

    // A missing name or procedure reads as the empty text.
    const char* fileNameLocal() const noexcept { return text(LogFileNameLocal); }
    const char* fileNameUTF8() const noexcept { return text(LogFileNameUTF8); }
    const char* procedure() const noexcept { return text(LogProcedure); }
    std::size_t pathLengthLocal() const noexcept { return LogPathNameLengthLocal; }
    std::size_t pathLengthUTF8() const noexcept { return LogPathNameLengthUTF8; }
    char debugMode() const noexcept { return LogDebugMode.load(std::memory_order_relaxed); }
    char type() const noexcept { return LogType; }
    LogBase* next() const noexcept { return Next; }
    LogBase* prev() const noexcept { return Prev; }

protected:
    static const char* text(const std::unique_ptr<char[]>& field) noexcept {
        return field ? field.get() : "";
    }

    std::atomic<char> LogDebugMode{'N'}; ///< a refresh changes it while the log's thread reads it
    char LogType = 'S';
    std::unique_ptr<char[]> LogFileNameUTF8;
    std::unique_ptr<char[]> LogFileNameLocal;
    std::unique_ptr<char[]> LogProcedure;
    LogBase* Next = nullptr;
    LogBase* Prev = nullptr;
    std::size_t LogPathNameLengthLocal = 0;
    std::size_t LogPathNameLengthUTF8 = 0;
};

} // namespace zrm

#endif
