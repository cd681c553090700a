// The lines of syslog files that are followed, in any form that SyslogForms knows.

#include "base/RowBytes.h"
#include "base/TraceScope.h"
#include "logs/FollowSettings.h"
#include "logs/zrm_rmlogent_data.h"
#include "logtypes/SysLogFile.h"
#include "logtypes/SyslogFields.h"
#include "logtypes/SyslogForms.h"

#include <algorithm>
#include <cstring>
#include <optional>
#include <string_view>

namespace zrm {

namespace {

TRC1_Anchor anchor{"SysLogFileForms.cpp"};

/// The line of a log of which the calling thread made the log's own row last. The conditions on its
/// fields ask for them right after that.
struct LastLine {
    std::string_view line = "";
    SyslogHead::Form form = SyslogHead::Form::none;
    SyslogParts parts;

    bool is(std::string_view other) const noexcept {
        return other.data() == line.data() && other.size() == line.size();
    }
};

constinit thread_local LastLine lastLine;

/// In a report, the entry read before is newer.
char* newestOf(void* reportState) {
    return reportState == nullptr ? nullptr
                                  : static_cast<SyslogBufferInfo*>(reportState)->timestamp;
}

std::string_view withoutLineEnd(const char* line) {
    std::size_t length = std::strlen(line);
    length -= length > 0 && line[length - 1] == '\n' ? 1 : 0;
    length -= length > 0 && line[length - 1] == '\r' ? 1 : 0;
    return {line, length};
}

/// Fills a blank column with as much of the text as it takes, and returns how much that is.
template <std::size_t width> std::size_t fillColumn(char (&column)[width], std::string_view text) {
    const std::size_t length = std::min(text.size(), width);
    RowBytes::copy(column, text.data(), length);
    return length;
}

/// Fills the source column with "app[process]".
template <std::size_t width>
std::size_t fillSource(char (&column)[width], const SyslogParts& parts) {
    std::size_t length = fillColumn(column, parts.source);
    if (!parts.processId.empty()) {
        for (const std::string_view part :
             {std::string_view("["), parts.processId, std::string_view("]")}) {
            length += part.copy(column + length, width - length);
        }
    }
    return length;
}

} // namespace

void SysLogFile::readFields(std::string_view text, EntryFields& fields) const {
    if (lastLine.is(text)) {
        SyslogFields::read(text, lastLine.form, lastLine.parts, fields);
    } else {
        SyslogFields::read(text, fields);
    }
}

char* SysLogFile::formatFollowedTime(char* out, char* line, void* reportState) const {
    TraceScope trace(anchor);
    const SyslogHead head =
        SyslogClock::readOnce(withoutLineEnd(line), *followSettings(), newestOf(reportState), out);
    return trace.result(line + head.end);
}

long SysLogFile::formatFollowedEntry(char* line, EntryRow& row, void* reportState) {
    TraceScope trace(anchor);
    zrm_rmlogent_data_t& entry = row.columns();
    const std::string_view text = withoutLineEnd(line);
    const bool isOwn = row.isOwn() && reportState == nullptr;
    const SyslogHead head = isOwn ? m_lineClock.read(text, entry.entrytime)
                                  : SyslogClock::readOnce(text, *followSettings(),
                                                          newestOf(reportState), entry.entrytime);
    const SyslogParts parts = SyslogForms::split(text, head);
    if (isOwn) {
        lastLine.line = text;
        lastLine.form = head.form;
        lastLine.parts = parts;
    }
    if (const auto priority = text.starts_with('<') ? SyslogForms::priority(text) : std::nullopt) {
        fillColumn(entry.entrytype, SyslogForms::severityOf(*priority));
        fillColumn(entry.entryclass, SyslogForms::facilityOf(*priority));
    }
    fillColumn(entry.entrysys, parts.host);
    const std::size_t sourceLength = fillSource(entry.entrysrc, parts);
    const std::size_t length = fillColumn(entry.entrydesc, parts.description);
    row.fillInUTF8({entry.entrysrc, sourceLength}, {parts.description.data(), length});
    return trace.result(0L);
}

} // namespace zrm
