// The lines of syslog files that are followed, in any form that SyslogForms knows.

#include "base/BrevanTime.h"
#include "base/TraceScope.h"
#include "base/UTF8Conv.h"
#include "framework/locale.h"
#include "logs/EntryClock.h"
#include "logs/FollowSettings.h"
#include "logs/zrm_rmlogent_data.h"
#include "logtypes/SysLogFile.h"
#include "logtypes/SyslogFields.h"
#include "logtypes/SyslogForms.h"

#include <algorithm>
#include <cstring>
#include <string_view>

namespace zrm {

namespace {

TRC1_Anchor anchor{"SysLogFileForms.cpp"};

constexpr std::size_t stampLength = 16;

std::string_view withoutLineEnd(const char* line) {
    std::string_view text(line);
    text.remove_suffix(text.ends_with('\n') ? 1 : 0);
    text.remove_suffix(text.ends_with('\r') ? 1 : 0);
    return text;
}

/// Fills a blank column with as much of the text as it takes, and returns how much that is.
template <std::size_t width> std::size_t fillColumn(char (&column)[width], std::string_view text) {
    return text.copy(column, width);
}

/// Fills the source column with "app[process]".
std::size_t fillSource(char* column, std::size_t width, const SyslogParts& parts) {
    std::size_t length = 0;
    const auto append = [&](std::string_view text) {
        length += text.copy(column + length, width - length);
    };
    append(parts.source);
    if (!parts.processId.empty()) {
        append("[");
        append(parts.processId);
        append("]");
    }
    return length;
}

} // namespace

void SysLogFile::writeFollowedTime(char* out, const SyslogTime& time, void* reportState) const {
    if (!time.hasTime) {
        return;
    }
    auto* const report = static_cast<SyslogBufferInfo*>(reportState);
    CivilTime civil = time.time;
    if (!time.hasYear) {
        char now[stampLength];
        if (report == nullptr) {
            BrevanTime::generateCurrentTimestamp(now);
        }
        // In a report, the entry read before is newer.
        civil.year = SyslogForms::yearOf(
            civil, ZoneTime::ofStamp(report == nullptr ? now : report->timestamp));
    }
    std::int64_t seconds = civil.seconds();
    const std::vector<ZoneOffset>& zone = followSettings()->zone;
    if (time.offset) {
        seconds -= *time.offset;
        lastEntryMoment = {EntryMoment::Kind::instant, seconds};
        seconds = ZoneTime::toLocal(seconds);
    } else if (!zone.empty()) {
        lastEntryMoment = {EntryMoment::Kind::zoned, seconds};
        seconds = ZoneTime::toLocal(ZoneTime::toUtc(seconds, zone));
    }
    if (ZoneTime::writeStamp(seconds, out) && report != nullptr) {
        std::memcpy(report->timestamp, out, stampLength);
    }
}

void SysLogFile::readFields(std::string_view text, EntryFields& fields) const {
    SyslogFields::read(text, fields);
}

char* SysLogFile::formatFollowedTime(char* out, char* line, void* reportState) const {
    TraceScope trace(anchor);
    const SyslogTime time = SyslogForms::recognise(withoutLineEnd(line));
    writeFollowedTime(out, time, reportState);
    return trace.result(line + time.end);
}

long SysLogFile::formatFollowedEntry(char* line, EntryRow& row, void* reportState) {
    TraceScope trace(anchor);
    zrm_rmlogent_data_t& entry = row.columns();
    const std::string_view text = withoutLineEnd(line);
    const SyslogTime time = SyslogForms::recognise(text);
    writeFollowedTime(entry.entrytime, time, reportState);
    const SyslogParts parts = SyslogForms::split(text, time);
    fillColumn(entry.entrysys, parts.host);
    const std::size_t sourceLength = fillSource(entry.entrysrc, sizeof entry.entrysrc, parts);
    const std::size_t length = fillColumn(entry.entrydesc, parts.description);
    UTF8Conv::Convert_toUTF8(entry.uentrysrc, sizeof entry.uentrysrc, entry.entrysrc, sourceLength,
                             LOC2_NO_TERMINATOR);
    const std::int32_t lengthInUTF8 =
        UTF8Conv::Convert_toUTF8(entry.uentrydesc, sizeof entry.uentrydesc,
                                 parts.description.data(), length, LOC2_NO_TERMINATOR);
    row.setDescriptionLengths(length, lengthInUTF8);
    return trace.result(0L);
}

} // namespace zrm
