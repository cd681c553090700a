#ifndef ZRM_LOG_BASE_H
#define ZRM_LOG_BASE_H

#include <atomic>
#include <cstddef>
#include <memory>

namespace zrm {

struct FollowSettings;

/// Returns a heap copy of `name` and sets `pathLength` to the length of its directory part
/// including the last '/'. If there is none, `pathLength` is 0 and the trace shows an error. Ends
/// the process if memory runs out.
std::unique_ptr<char[]> newLogFileName(std::size_t& pathLength, const char* name);

/// The common part of a configuration line and a monitored log: the name in the local code page (to
/// open) and in UTF-8 (to report), type, debug mode, procedure, how it is followed, and the links
/// of a circular chain whose head the owner holds. Not locked; the log manager's lock guards the
/// chain.
class LogBase {
public:
    LogBase() = default;
    /// Copies everything but the links. The copy is not on a chain.
    LogBase(const LogBase& other);
    LogBase& operator=(const LogBase&) = delete;
    virtual ~LogBase() = default;

    /// Sets both names from one, which is UTF-8 if `isUTF8` is 1, else in the local code page.
    void setLogFileName(const char* name, int isUTF8);
    /// Sets the name of a log that is not a file. It is ASCII and has no '/'.
    void setSourceName(const char* name);
    /// False if a conversion cut the name or replaced characters, so that one name no longer
    /// denotes the same file as the other. `isUTF8` says which name was given. A name that could
    /// not be converted at all (no code page) still counts as kept.
    bool isNameKept(int isUTF8) const;
    /// Stores a copy of the procedure. Null remains null.
    void setLogProcedure(const char* procedure);
    /// Adds this object at the tail of the chain headed by `head`. Null: a chain of one.
    void addToChain(LogBase* head);
    /// Unlinks this object but leaves its own links unchanged. Not for a chain of one.
    void removeFromChain();
    /// Writes one trace record with all fields, whatever the trace level.
    void printSelf() const;

    // A missing name or procedure is returned as an empty text.
    const char* fileNameLocal() const noexcept { return text(LogFileNameLocal); }
    const char* fileNameUTF8() const noexcept { return text(LogFileNameUTF8); }
    const char* procedure() const noexcept { return text(LogProcedure); }
    std::size_t pathLengthLocal() const noexcept { return LogPathNameLengthLocal; }
    std::size_t pathLengthUTF8() const noexcept { return LogPathNameLengthUTF8; }
    char debugMode() const noexcept { return LogDebugMode.load(std::memory_order_relaxed); }
    char type() const noexcept { return LogType; }
    /// How the log is followed. Null for a log of the log configuration.
    const std::shared_ptr<const FollowSettings>& followSettings() const noexcept {
        return LogFollowSettings;
    }
    /// True if the log is not a file: its settings have a source.
    bool isSource() const noexcept;
    LogBase* next() const noexcept { return Next; }
    LogBase* prev() const noexcept { return Prev; }

protected:
    static const char* text(const std::unique_ptr<char[]>& field) noexcept {
        return field ? field.get() : "";
    }

    std::atomic<char> LogDebugMode{'N'}; ///< a refresh may change it while the thread reads it
    char LogType = 'S';
    std::unique_ptr<char[]> LogFileNameUTF8;
    std::unique_ptr<char[]> LogFileNameLocal;
    std::unique_ptr<char[]> LogProcedure;
    std::shared_ptr<const FollowSettings> LogFollowSettings;
    LogBase* Next = nullptr;
    LogBase* Prev = nullptr;
    std::size_t LogPathNameLengthLocal = 0;
    std::size_t LogPathNameLengthUTF8 = 0;
};

} // namespace zrm

#endif
