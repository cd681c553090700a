#include "host/formats/WtmpFormat.h"

#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <string_view>

#include <arpa/inet.h>
#include <utmpx.h>

namespace zrm::host {

namespace {

struct RecordType {
    std::string_view name; ///< the system's
    std::string_view text; ///< in the column
};

// Indexed by record type. The texts are those of the accounting log where a record means the same.
constexpr RecordType recordTypes[] = {
    {"EMPTY", "Unused space"},          {"RUN_LVL", "Run level"},
    {"BOOT_TIME", "System boot time"},  {"NEW_TIME", "New time"},
    {"OLD_TIME", "Old time"},           {"INIT_PROCESS", "init process"},
    {"LOGIN_PROCESS", "getty waiting"}, {"USER_PROCESS", "User process"},
    {"DEAD_PROCESS", "Zombie process"}, {"ACCOUNTING", "Accounting"},
};
static_assert(EMPTY == 0 && RUN_LVL == 1 && BOOT_TIME == 2 && NEW_TIME == 3 && OLD_TIME == 4 &&
              INIT_PROCESS == 5 && LOGIN_PROCESS == 6 && USER_PROCESS == 7 && DEAD_PROCESS == 8);

/// The text of a NUL-padded field.
template <std::size_t size> std::string_view textOf(const char (&field)[size]) noexcept {
    return {field, strnlen(field, size)};
}

/// A number as text, in memory of its own.
class NumberText {
public:
    explicit NumberText(long number) noexcept
        : m_end(std::to_chars(m_text, m_text + sizeof m_text, number).ptr) {}
    std::string_view view() const noexcept {
        return {m_text, static_cast<std::size_t>(m_end - m_text)};
    }

private:
    char m_text[20]{};
    const char* const m_end;
};

/// The remote address; empty if the record has none.
std::string_view addressOf(const utmpx& record, char (&room)[INET6_ADDRSTRLEN]) noexcept {
    const auto& words = record.ut_addr_v6;
    const bool isV6 = words[1] != 0 || words[2] != 0 || words[3] != 0;
    if (!isV6 && words[0] == 0) {
        return {};
    }
    return inet_ntop(isV6 ? AF_INET6 : AF_INET, words, room, sizeof room);
}

/// The run level that a record reports; empty if it reports none.
std::string_view runLevelOf(const utmpx& record, char& room) noexcept {
    room = static_cast<char>(record.ut_pid % 256);
    const bool isLevel = record.ut_type == RUN_LVL && room > ' ' && room < '\x7f';
    return {&room, isLevel ? std::size_t{1} : std::size_t{0}};
}

class WtmpReader final : public EntryFormat::Reader {
public:
    bool read(std::string_view entry, EntryColumns& columns) override {
        utmpx record;
        m_reason = problemOf(entry, record);
        if (!m_reason.empty()) {
            return false;
        }
        columns.hasTime = columns.hasYear = true;
        columns.time = CivilTime::of(record.ut_tv.tv_sec);
        columns.offset = 0;
        columns.source = textIn(entry, record, record.ut_line);
        columns.type = recordTypes[record.ut_type].text;
        columns.description = describe(record);
        return true;
    }

    void readFields(std::string_view entry, EntryFields& fields) override {
        utmpx record;
        if (!problemOf(entry, record).empty()) {
            return;
        }
        char room[INET6_ADDRSTRLEN];
        char level;
        fields.add("type", recordTypes[record.ut_type].name);
        addText(fields, "user", textIn(entry, record, record.ut_user));
        addText(fields, "line", textIn(entry, record, record.ut_line));
        addText(fields, "id", textIn(entry, record, record.ut_id));
        addText(fields, "host", textIn(entry, record, record.ut_host));
        addBuilt(fields, "address", addressOf(record, room));
        addBuilt(fields, "runlevel", runLevelOf(record, level));
        addBuilt(fields, "pid", NumberText(record.ut_pid).view());
        addBuilt(fields, "session", NumberText(record.ut_session).view());
        addBuilt(fields, "termination", NumberText(record.ut_exit.e_termination).view());
        addBuilt(fields, "exit", NumberText(record.ut_exit.e_exit).view());
    }

    std::string_view reason() const noexcept override { return m_reason; }

private:
    /// Sets the record, or says why there is none.
    static std::string_view problemOf(std::string_view entry, utmpx& record) noexcept {
        if (entry.size() != sizeof record) {
            return "it is not a whole login record";
        }
        std::memcpy(&record, entry.data(), sizeof record);
        if (record.ut_type < 0 ||
            static_cast<std::size_t>(record.ut_type) >= std::size(recordTypes)) {
            return "the type of the login record is not one of the known ones";
        }
        return record.ut_tv.tv_sec > 0 ? "" : "the login record has no time";
    }

    /// The text of a field of the record, as a view into the entry.
    template <std::size_t size>
    static std::string_view textIn(std::string_view entry, const utmpx& record,
                                   const char (&field)[size]) noexcept {
        const auto offset =
            static_cast<std::size_t>(field - reinterpret_cast<const char*>(&record));
        return entry.substr(offset, textOf(field).size());
    }

    static void addText(EntryFields& fields, std::string_view name,
                        std::string_view value) noexcept {
        if (!value.empty()) {
            fields.add(name, value);
        }
    }
    static void addBuilt(EntryFields& fields, std::string_view name,
                         std::string_view value) noexcept {
        addText(fields, name, fields.append(value).takeText().value_or(""));
    }

    std::string_view describe(const utmpx& record) noexcept {
        m_length = 0;
        append("user = ");
        append(textOf(record.ut_user));
        append("; id = ");
        append(textOf(record.ut_id));
        append("; pid = ");
        append(NumberText(record.ut_pid).view());
        append("; term status = ");
        append(NumberText(record.ut_exit.e_termination).view());
        append("; exit status = ");
        append(NumberText(record.ut_exit.e_exit).view());
        return {m_text, m_length};
    }
    void append(std::string_view text) noexcept {
        m_length += text.copy(m_text + m_length, sizeof m_text - m_length);
    }

    std::string_view m_reason;
    char m_text[160]; ///< longer than the longest description
    std::size_t m_length = 0;
};

} // namespace

Result<std::shared_ptr<const EntryFormat>> WtmpFormat::make(const FormatDescription& description) {
    if (!description.patterns.empty()) {
        return refused("login records have no pattern", "leave it out", "format");
    }
    return std::shared_ptr<const EntryFormat>(new WtmpFormat(description));
}

WtmpFormat::WtmpFormat(const FormatDescription& description)
    : m_definition(description.definition()) {}

std::size_t WtmpFormat::recordLength() const noexcept {
    return sizeof(utmpx);
}

std::unique_ptr<EntryFormat::Reader> WtmpFormat::reader() const {
    return std::make_unique<WtmpReader>();
}

} // namespace zrm::host
