#ifndef ZRM_HOST_EVENT_ROW_H
#define ZRM_HOST_EVENT_ROW_H

#include "host/events/Event.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

namespace zrm::host {

/// The codes of a severity in other systems.
struct SeverityCodes {
    std::string_view severity;
    int syslog; ///< RFC 5424: 6 informational, 5 notice, 4 warning, 3 error, 2 critical
    int otel;   ///< SeverityNumber of OpenTelemetry: 9 INFO, 10 INFO2, 13 WARN, 17 ERROR, 21 FATAL

    /// The codes of a severity; those of "warning" for an unknown name.
    static constexpr const SeverityCodes& of(std::string_view severity) noexcept;
};

inline constexpr std::array severityCodes = {
    SeverityCodes{"info", 6, 9},      SeverityCodes{"minor", 5, 10},
    SeverityCodes{"warning", 4, 13},  SeverityCodes{"major", 3, 17},
    SeverityCodes{"critical", 2, 21},
};

constexpr const SeverityCodes& SeverityCodes::of(std::string_view severity) noexcept {
    const auto found =
        std::find_if(severityCodes.begin(), severityCodes.end(),
                     [&](const SeverityCodes& codes) { return codes.severity == severity; });
    return found == severityCodes.end() ? severityCodes[2] : *found;
}

/// The row of an event, what it has of its entry beside the row, and its episode, parsed from the
/// event's JSON for sinks that write it in another form. Immutable, so any thread.
class EventRow {
public:
    struct Column {
        std::string name; ///< upper-case
        std::variant<std::string, std::int64_t> value;
    };

    /// Has no columns when the record's JSON contains no row.
    explicit EventRow(const EventRecord& event);

    /// The columns in table order.
    std::span<const Column> columns() const noexcept { return m_columns; }

    /// The text of a character column; empty when there is no column of this name.
    std::string_view text(std::string_view column) const;

    struct Field {
        std::string name;
        std::string value;
    };

    /// The fields of the entry that the event has, in the order of the entry.
    std::span<const Field> fields() const noexcept { return m_fields; }

    /// The whole entry, unchanged; empty if the event does not have it.
    const std::string& entry() const noexcept { return m_entry; }

    /// The text of the entry, as far as its column holds it. Of an event without a row, what it
    /// says of its episode.
    std::string_view description() const;

    /// What the text of a resolved event begins with for people.
    static constexpr std::string_view resolvedPrefix = "Resolved: ";

    /// The text that the situation has made for this event, with resolvedPrefix if it is resolved;
    /// empty: its text is the same for all.
    const std::string& eventText() const noexcept { return m_eventText; }

    /// What people read first: the text made for this event, or else the description.
    std::string_view message() const;

    /// The URL of what to do about the event; empty: none.
    const std::string& runbook() const noexcept { return m_runbook; }

    /// The situation's labels.
    std::span<const Field> labels() const noexcept { return m_labels; }

    /// The program, or part of a program, that wrote the entry.
    std::string_view source() const;

    /// The name of the system on which the entry was written.
    std::string_view node() const;

    /// "raised" or "resolved"; empty: the situation has no episodes.
    const std::string& state() const noexcept { return m_state; }
    bool isResolved() const noexcept { return m_state == "resolved"; }

    /// The episode that the event belongs to; its texts are times. Zero and empty if there is none.
    struct Episode {
        std::uint64_t id = 0;
        std::uint64_t count = 0; ///< entries so far
        std::string raised;
        std::string first; ///< time of the first entry
        std::string last;
    };
    const Episode& episode() const noexcept { return m_episode; }

    /// The values of the event's group.
    std::span<const Field> group() const noexcept { return m_group; }

private:
    void describeEpisode(std::string_view reason);

    std::vector<Column> m_columns;
    std::vector<Field> m_fields;
    std::string m_entry;
    std::string m_state;
    Episode m_episode;
    std::vector<Field> m_group;
    std::string m_eventText;
    std::string m_runbook;
    std::vector<Field> m_labels;
    std::string m_node; ///< as written
    std::string m_text; ///< of an event without a row
};

} // namespace zrm::host

#endif
