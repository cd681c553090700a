#ifndef ZRM_FRAMEWORK_LOG_ENTRY_H
#define ZRM_FRAMEWORK_LOG_ENTRY_H

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm {

class EntryFields;

/// What the events of a log keep of their entries beside the rows.
struct EntryKeep {
    static constexpr std::size_t longestText = 64 * 1024; ///< bytes

    /// Names of fields; "*" means all. None: those that the situation's conditions name.
    std::optional<std::vector<std::string>> fields;
    std::size_t textBytes = longestText; ///< of the entry's text; 0: the text is not kept

    bool operator==(const EntryKeep&) const = default;
};

/// The entry of a log whose row a thread offers to requests: what the columns do not hold. Fields
/// are read only when somebody asks for them, once per entry. Used by the thread that offers the
/// row, until the next entry.
class LogEntry {
public:
    LogEntry() = default;
    LogEntry(const LogEntry&) = delete;
    LogEntry& operator=(const LogEntry&) = delete;
    virtual ~LogEntry() = default;

    /// The entry as the log has it, without its line end, or the first EntryKeep::longestText bytes
    /// of a longer one. In the code page of the log. Empty if the log has no text.
    virtual std::string_view text() const = 0;
    /// True if the entry is longer than its text.
    virtual bool isCut() const = 0;
    virtual const EntryFields& fields() = 0;
    virtual const EntryKeep& keep() const = 0;

    /// The entry whose row the calling thread offers. Null if all it has is the row, as for every
    /// log of the log configuration.
    static inline constinit thread_local LogEntry* ofThisThread = nullptr;

    /// Makes an entry that of the calling thread while the object exists.
    class Offer {
    public:
        explicit Offer(LogEntry& entry) noexcept : m_before(ofThisThread) { ofThisThread = &entry; }
        Offer(const Offer&) = delete;
        Offer& operator=(const Offer&) = delete;
        ~Offer() { ofThisThread = m_before; }

    private:
        LogEntry* const m_before;
    };
};

} // namespace zrm

#endif
