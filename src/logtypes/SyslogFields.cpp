#include "logtypes/SyslogFields.h"

#include "base/EntryFields.h"

#include <algorithm>
#include <optional>

namespace zrm {

namespace {

constexpr std::string_view numbers = "0 1 2 3 4 5 6 7 8 9 1011121314151617181920212223";

/// A number up to 23 as text.
std::string_view textOf(unsigned number) {
    return numbers.substr(2 * std::size_t{number}, number < 10 ? 1 : 2);
}

void addPart(EntryFields& fields, std::string_view name, std::string_view value) {
    if (!value.empty()) {
        fields.add(name, value);
    }
}

void addPriority(EntryFields& fields, unsigned priority) {
    const unsigned facility = priority / 8;
    const unsigned severity = priority % 8;
    fields.add("facility", SyslogForms::facilityOf(priority));
    fields.add("facility_code", textOf(facility));
    fields.add("severity", SyslogForms::severityOf(priority));
    fields.add("severity_code", textOf(severity));
}

/// Splits "name[process]".
void addSource(EntryFields& fields, std::string_view source) {
    const std::size_t bracket = source.rfind('[');
    const bool hasProcess = bracket != std::string_view::npos && source.ends_with(']');
    addPart(fields, "tag", source.substr(0, hasProcess ? bracket : source.size()));
    if (hasProcess) {
        addPart(fields, "pid", source.substr(bracket + 1, source.size() - bracket - 2));
    }
}

/// Takes the elements "[SDID NAME="VALUE" ...]" off structured data one after another.
class StructuredData {
public:
    StructuredData(std::string_view data, EntryFields& fields) : m_rest(data), m_fields(fields) {}

    void read() {
        while (take('[')) {
            const std::string_view id = takeUntil(" ]");
            while (take(' ')) {
                const std::string_view name = takeUntil("= ]");
                if (!take('=') || !take('"') || !readValue(id, name)) {
                    return;
                }
            }
            if (!take(']')) {
                return;
            }
        }
    }

private:
    bool take(char character) {
        const bool isThere = m_rest.starts_with(character);
        m_rest.remove_prefix(isThere ? 1 : 0);
        return isThere;
    }
    std::string_view takeUntil(std::string_view ends) {
        const std::string_view taken = m_rest.substr(0, m_rest.find_first_of(ends));
        m_rest.remove_prefix(taken.size());
        return taken;
    }
    /// Reads up to the closing quote. False if there is none.
    bool readValue(std::string_view id, std::string_view name) {
        bool hasEscapes = false;
        std::size_t end = 0;
        for (; end < m_rest.size() && m_rest[end] != '"'; ++end) {
            if (m_rest[end] == '\\') {
                hasEscapes = true;
                ++end;
            }
        }
        if (end >= m_rest.size()) {
            return false;
        }
        const std::string_view value = m_rest.substr(0, end);
        m_rest.remove_prefix(end + 1);
        add(id, name, hasEscapes ? unescaped(value) : value);
        return true;
    }
    void add(std::string_view id, std::string_view name, std::optional<std::string_view> value) {
        const bool isShort = id.size() + name.size() < EntryFields::longestName;
        const auto whole = m_fields.all().size() < EntryFields::most && isShort && value
                               ? m_fields.append(id).append(".").append(name).takeText()
                               : std::nullopt;
        if (whole) {
            m_fields.add(*whole, *value);
        } else {
            m_fields.noteLeftOut();
        }
    }
    /// A backslash stands before a quote, a backslash or a bracket, and for itself elsewhere.
    std::optional<std::string_view> unescaped(std::string_view value) {
        while (!value.empty()) {
            const std::size_t plain = std::min(value.find('\\', 1), value.size());
            const bool isEscape = value.size() > 1 && value[0] == '\\' &&
                                  std::string_view("\"\\]").find(value[1]) != value.npos;
            const std::size_t from = isEscape ? 1 : 0;
            const std::size_t length = isEscape ? 1 : plain;
            m_fields.append(value.substr(from, length));
            value.remove_prefix(from + length);
        }
        return m_fields.takeText();
    }

    std::string_view m_rest;
    EntryFields& m_fields;
};

} // namespace

void SyslogFields::read(std::string_view line, EntryFields& fields) noexcept {
    const SyslogTime time = SyslogForms::recognise(line);
    read(line, time.form, SyslogForms::split(line, time), fields);
}

void SyslogFields::read(std::string_view line, SyslogHead::Form form, const SyslogParts& parts,
                        EntryFields& fields) noexcept {
    addPart(fields, "host", parts.host);
    if (form == SyslogHead::Form::rfc5424) {
        addPart(fields, "tag", parts.source);
        addPart(fields, "pid", parts.processId);
        addPart(fields, "app", parts.source);
        addPart(fields, "procid", parts.processId);
        addPart(fields, "msgid", parts.messageId);
    } else {
        addSource(fields, parts.source);
    }
    addPart(fields, "message", parts.description);
    if (const auto priority = SyslogForms::priority(line)) {
        addPriority(fields, *priority);
    }
    StructuredData(parts.data, fields).read();
}

} // namespace zrm
