#include "logtypes/EntryReader.h"

#include "logs/FurtherLogs.h"
#include "logs/ValidLog.h"
#include "logs/ZoneTime.h"
#include "logtypes/AdminLogFile.h"
#include "logtypes/FormatLogFile.h"
#include "logtypes/SysLogFile.h"
#include "logtypes/UserLogFile.h"
#include "parser/StringParser.h"

#include <cstring>

namespace zrm {

namespace {

constexpr std::int64_t secondsOfDay = 86'400;

class SyslogEntries final : public EntryReader {
public:
    explicit SyslogEntries(const ValidLog& log) : m_log(log) {}

    bool read(char* entry, std::string_view /*text*/, const char* newest,
              zrm_rmlogent_data_t& row) override {
        std::memcpy(m_context.timestamp, newest, stampLength);
        return m_log.formatEntryAsRow(entry, &row, &m_context) == 0 && row.entrytime[0] != ' ';
    }
    void readFields(std::string_view text, EntryFields& fields) override {
        m_log.readFields(text, fields);
    }

private:
    struct Log : SysLogFile {
        explicit Log(const ValidLog& log) : SysLogFile(log, Unmonitored{}) {}
    };

    Log m_log;
    SyslogBufferInfo m_context{};
};

class TextEntries final : public EntryReader {
public:
    explicit TextEntries(const ValidLog& log) : m_log(log) {}

    bool hasFormat() const noexcept { return m_log.hasFormat(); }
    bool read(char* entry, std::string_view /*text*/, const char* newest,
              zrm_rmlogent_data_t& row) override {
        setDate(newest);
        return m_log.formatEntryAsRow(entry, &row, &m_context) == 0;
    }

private:
    struct Log : UserLogFile {
        explicit Log(const ValidLog& log) : UserLogFile(log, Unmonitored{}) {
            auto format = std::make_unique<StringParser>(procedure(), followedFields());
            if (format->status() == OBJECT_FORMAT_LEARNED) {
                SPAnchor = std::move(format);
            }
        }
        bool hasFormat() const noexcept { return SPAnchor != nullptr; }
    };

    /// Lines that are slightly out of order may be of the next day, which may be of the next year.
    void setDate(const char* newest) {
        if (std::memcmp(m_newest, newest, stampLength) != 0) {
            std::memcpy(m_newest, newest, stampLength);
            const CivilTime date =
                CivilTime::of(ZoneTime::ofStamp(newest).seconds() + secondsOfDay);
            m_century = date.year / 100 - 19;
            m_year = date.year % 100;
            m_month = date.month;
            m_day = date.day;
        }
        m_context.century = m_century;
        m_context.year = m_year;
        m_context.month = m_month;
        m_context.day = m_day;
    }

    Log m_log;
    UserlogBufferInfo m_context{};
    char m_newest[stampLength]{};
    long m_century = 0;
    long m_year = 0;
    long m_month = 0;
    long m_day = 0;
};

class AccountingEntries final : public EntryReader {
public:
    explicit AccountingEntries(const ValidLog& log) : m_log(log) {}

    std::size_t recordLength() const noexcept override { return AdminLogFile::recordLength; }
    bool read(char* entry, std::string_view /*text*/, const char* /*newest*/,
              zrm_rmlogent_data_t& row) override {
        return m_log.formatEntryAsRow(entry, &row, nullptr) == 0;
    }

private:
    struct Log : AdminLogFile {
        explicit Log(const ValidLog& log) : AdminLogFile(log, Unmonitored{}) {}
    };

    Log m_log;
};

class FormatEntries final : public EntryReader {
public:
    explicit FormatEntries(const ValidLog& log) : m_log(log), m_parser(m_log.followSettings()) {}

    std::size_t recordLength() const noexcept override { return m_log.format().recordLength(); }
    bool read(char* /*entry*/, std::string_view text, const char* newest,
              zrm_rmlogent_data_t& row) override {
        return m_log.makeRow(m_parser, text, newest, row);
    }
    void readFields(std::string_view text, EntryFields& fields) override {
        m_parser.reader->readFields(text, fields);
    }

private:
    struct Log : FormatLogFile {
        explicit Log(const ValidLog& log) : FormatLogFile(log, Unmonitored{}) {}
    };

    Log m_log;
    FormatLogFile::Parser m_parser;
};

} // namespace

std::unique_ptr<EntryReader> EntryReader::of(const LogFile& log) {
    const ValidLog line(
        FurtherLog{log.fileNameUTF8(), log.type(), 'N', log.procedure(), log.followSettings()});
    switch (log.type()) {
    case 'S':
        return std::make_unique<SyslogEntries>(line);
    case 'U': {
        auto entries = std::make_unique<TextEntries>(line);
        return entries->hasFormat() ? std::move(entries) : nullptr;
    }
    case 'A':
        return std::make_unique<AccountingEntries>(line);
    case FormatLogFile::typeLetter:
        return std::make_unique<FormatEntries>(line);
    default:
        return nullptr;
    }
}

} // namespace zrm
