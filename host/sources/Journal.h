#ifndef ZRM_HOST_JOURNAL_H
#define ZRM_HOST_JOURNAL_H

#include "host/config/SourceConfig.h"
#include "host/formats/MessageFormat.h"
#include "host/sources/JournalLine.h"
#include "logs/EntrySource.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

struct sd_journal;

namespace zrm::host {

/// An open journal, restricted to the entries that a configuration names. What the configuration
/// says of identifiers, priority, boot and whole names of units is left to the library and its
/// indexes; globs are compared here. Entries that this agent itself has caused are passed over,
/// since each could raise an event that writes the next. One thread.
class Journal {
public:
    /// What a step has found.
    enum class Step : unsigned char {
        entry,
        none,
        passing, ///< so many unwanted entries that the caller should look around; go on
        failed,
    };

    /// `messages`: what is read from them; null: they are taken as they are.
    explicit Journal(const JournalConfig& config,
                     std::shared_ptr<const MessageFormat> messages = nullptr);
    ~Journal();
    Journal(const Journal&) = delete;
    Journal& operator=(const Journal&) = delete;

    /// Opens the files. Returns 0, or the negative errno of what failed.
    int open();
    bool isOpen() const noexcept { return m_journal != nullptr; }
    void close() noexcept;

    // Positions. The next step goes on from there. Return 0, or a negative errno.

    int seekHead();
    int seekTail();
    int seekTime(std::uint64_t microseconds);
    int seekCursor(const std::string& cursor);

    /// The next newer or older entry, and its contents.
    Step next() { return step(Direction::forward); }
    Step previous() { return step(Direction::backward); }
    /// Goes to the next older entry, wanted or not, without its contents. False if there is none.
    bool stepBack();
    /// How many damaged entries have been passed over.
    std::uint64_t damaged() const noexcept { return m_damaged; }
    /// The negative errno of the step that has failed.
    int error() const noexcept { return m_error; }

    /// Whether the last entry is that of the cursor.
    bool isAt(const std::string& cursor) const;
    /// Of the last entry that was looked at; empty if there is none.
    std::string cursor() const;
    /// Whether any entry has the cursor, whatever the configuration names. Moves the position.
    static bool holds(const JournalConfig& config, const std::string& cursor);
    /// When an entry was written, from its cursor: microseconds since 1970-01-01 UTC; 0: unknown.
    static std::uint64_t timeOf(std::string_view cursor) noexcept;

    /// Waits for new entries. Returns true if files were added or removed.
    bool wait(std::chrono::milliseconds most);

    // The last entry.

    /// A copy of it.
    JournalLine line();
    /// Makes what was joined the last entry, for what follows. It must be valid until the next one.
    void show(const JournalEntry& entry);
    /// Call it before readFields.
    void read(EntryColumns& columns);
    char* text() noexcept { return m_message.data(); }
    std::string_view message() const noexcept { return {m_message.data(), m_messageLength}; }
    bool isMessageCut() const noexcept { return m_isMessageCut; }
    void readFields(EntryFields& fields);
    /// Microseconds since 1970-01-01 UTC.
    std::uint64_t time() const noexcept { return m_time; }

private:
    enum class Direction : unsigned char { forward, backward };
    /// The fields that columns are made of.
    enum Slot : unsigned char { host, unit, managed, identifier, command, process, claimed, slots };
    static constexpr std::size_t slotRoom = 256; ///< bytes

    struct Text {
        std::array<char, slotRoom> text;
        std::size_t length = 0;
    };

    void addMatches();
    void addAlternatives(const char* field, const std::vector<std::string>& values);
    Step step(Direction direction);
    bool load();
    void forget() noexcept;
    void take(std::string_view data);
    void addField(std::string_view field, EntryFields& fields) const;
    void keep(Slot slot, std::string_view value) noexcept;
    std::string_view of(Slot slot) const noexcept {
        return {m_slots[slot].text.data(), m_slots[slot].length};
    }
    bool isWanted() const;
    void buildSource();

    const JournalConfig m_config;
    const std::shared_ptr<const MessageFormat> m_messages;
    std::optional<MessageFormat::Reader> m_messageReader;
    const bool m_hasGlobs;       ///< among the units
    std::string m_ownProgram;    ///< `_EXE` of this process; empty: unknown
    std::string m_ownInvocation; ///< of the service that this process belongs to; empty: none
    sd_journal* m_journal = nullptr;
    std::array<Text, slots> m_slots{};
    std::array<char, 2 * slotRoom> m_source{}; ///< "identifier[process]"
    std::size_t m_sourceLength = 0;
    std::vector<char> m_message; ///< terminated
    std::size_t m_messageLength = 0;
    bool m_isMessageCut = false;
    bool m_hasMessage = false;
    int m_priority = -1;  ///< -1: the entry has none
    bool m_isOwn = false; ///< this agent has written the entry
    std::uint64_t m_time = 0;
    const JournalLine* m_shown = nullptr; ///< null: the last entry is the library's
    std::uint64_t m_damaged = 0;
    int m_error = 0;
};

} // namespace zrm::host

#endif
