#include "monitor/ReportOutcome.h"

namespace zrm {

namespace {

thread_local ReportOutcome* current = nullptr;

} // namespace

ReportOutcome::ReportOutcome(ReportedFile file) noexcept : m_outer(current), m_file(file) {
    current = this;
    m_reached.reserve(stampLength);
}

ReportOutcome::~ReportOutcome() {
    current = m_outer;
}

ReportedFile ReportOutcome::file() noexcept {
    return current != nullptr ? current->m_file : ReportedFile::named;
}

void ReportOutcome::note(ReportEnd end) noexcept {
    if (current != nullptr && !current->m_isNoted) {
        current->m_isNoted = true;
        current->m_end = end;
    }
}

void ReportOutcome::noteReached(const char* entryTime) noexcept {
    if (current != nullptr) {
        current->m_reached.assign(entryTime, stampLength); // capacity is reserved
    }
}

const char* ReportOutcome::reason() const noexcept {
    switch (m_end) {
    case ReportEnd::complete:
        break;
    case ReportEnd::notRead:
        return "the log cannot be read";
    case ReportEnd::otherFile:
        return "its name is another file's by now, and its monitor reads the one that had the "
               "name before";
    case ReportEnd::formatErrors:
        return "eleven lines in a row do not fit the log's format, and a report ends there";
    case ReportEnd::longLine:
        return "a line is too long, and a report ends there";
    case ReportEnd::noTime:
        return "an entry has no time, and a report ends there";
    case ReportEnd::readError:
        return "reading the log failed";
    case ReportEnd::brokenRecord:
        return "the log does not consist of whole records";
    case ReportEnd::notAnEntry:
        return "the log's command wrote a line that is not an entry";
    case ReportEnd::commandFailed:
        return "the log's command failed";
    case ReportEnd::rowLimit:
        return "the report has read as many entries as it may";
    }
    return "";
}

} // namespace zrm
