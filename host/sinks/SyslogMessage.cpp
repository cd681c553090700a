#include "host/sinks/SyslogMessage.h"

#include "host/base/SteeringText.h"
#include "host/base/TimeText.h"
#include "host/base/Utf8.h"
#include "host/config/SinkTypes.h"
#include "host/sinks/EventRow.h"

#include <algorithm>

#include <unistd.h>

namespace zrm::host {

namespace {

constexpr std::size_t longestHostName = 255; ///< bytes
constexpr std::string_view byteOrderMark = "\xef\xbb\xbf";

bool isControl(char c) {
    return static_cast<unsigned char>(c) < ' ' || c == 0x7f;
}

/// The text on one line, in which nothing steers how it is shown: a blank for each control of
/// ASCII, other characters by number.
std::string visible(std::string_view text) {
    std::string result;
    result.reserve(text.size());
    while (!text.empty()) {
        const Utf8::Sequence sequence = Utf8::firstSequence(text);
        const std::string_view bytes = text.substr(0, sequence.length);
        if (sequence.length == 1) {
            result += isControl(bytes.front()) ? ' ' : bytes.front();
        } else if (sequence.valid && Utf8::isSteering(Utf8::character(bytes))) {
            SteeringText::appendEscape(result, Utf8::character(bytes));
        } else {
            result += bytes;
        }
        text.remove_prefix(sequence.length);
    }
    return result;
}

bool isAscii(std::string_view text) {
    return std::all_of(text.begin(), text.end(),
                       [](char c) { return static_cast<unsigned char>(c) < 0x80; });
}

/// A field of the header has no blanks and nothing but ASCII; a lone dash says that it is unknown.
std::string headerField(std::string_view text) {
    std::string field(text.substr(0, longestHostName));
    std::replace_if(
        field.begin(), field.end(), [](char c) { return c <= ' ' || c > '~'; }, '?');
    return field.empty() ? "-" : field;
}

void appendParameter(std::string& data, const char* name, std::string_view value) {
    data += ' ';
    data += name;
    data += "=\"";
    for (const char c : visible(value)) {
        if (c == '"' || c == '\\' || c == ']') {
            data += '\\';
        }
        data += c;
    }
    data += '"';
}

/// The name of a parameter: printable ASCII, at most 32 bytes.
std::string parameterName(std::string_view field) {
    constexpr std::size_t longestName = 32;
    std::string name(field.substr(0, longestName));
    std::replace_if(
        name.begin(), name.end(),
        [](char c) { return c <= ' ' || c > '~' || c == '=' || c == ']' || c == '"'; }, '_');
    return name;
}

/// The fields as an element of structured data, as far as it takes at most this many bytes.
void appendFields(std::string& data, const EventRow& row, std::size_t most) {
    std::string parameters;
    for (const EventRow::Field& field : row.fields()) {
        const std::size_t before = parameters.size();
        appendParameter(parameters, parameterName(field.name).c_str(), field.value);
        if (parameters.size() > most) {
            parameters.resize(before);
        }
    }
    if (!parameters.empty()) {
        data += "[zrm-fields@32473" + parameters + ']';
    }
}

/// The text made for this event; or else the description, or the whole entry if the column holds
/// only its beginning.
std::string_view textOf(const EventRow& row) {
    if (!row.eventText().empty()) {
        return row.eventText();
    }
    constexpr std::size_t width = 256; // of ENTRYDESC
    const bool isCut = row.text("ENTRYDESC").size() >= width - 1;
    return isCut && !row.entry().empty() ? row.entry() : row.description();
}

/// The text on one line, with the mark that tells UTF-8 where it is not ASCII, in at most this
/// many bytes.
std::string messageText(std::string_view description, std::size_t most) {
    std::string text(isAscii(description) ? "" : byteOrderMark);
    text += visible(description);
    if (text.size() > most) {
        // Not within a character: those behind its first byte begin with the bits 10.
        while (most > 0 && (static_cast<unsigned char>(text[most]) & 0xc0) == 0x80) {
            --most;
        }
        text.resize(most);
    }
    return text;
}

} // namespace

SyslogMessage::SyslogMessage(std::string_view facility)
    : m_facility(static_cast<std::size_t>(
          std::find(syslogFacilities.begin(), syslogFacilities.end(), facility) -
          syslogFacilities.begin())),
      m_process(std::to_string(getpid())) {}

std::string SyslogMessage::text(const EventRecord& event) const {
    const EventRow row(event);
    const auto severity = static_cast<std::size_t>(SeverityCodes::of(event.severity).syslog);
    std::string text = '<' + std::to_string(m_facility * 8 + severity) + ">1 ";
    UtcTime::append(text, event.raised);
    text += ' ' + headerField(row.node()) + " zrmagent " + m_process + " event [zrm@32473";
    appendParameter(text, "id", std::to_string(event.id));
    appendParameter(text, "situation", event.situation);
    appendParameter(text, "severity", event.severity);
    appendParameter(text, "log", event.log);
    if (!row.state().empty()) {
        appendParameter(text, "state", row.state());
        appendParameter(text, "episode", std::to_string(row.episode().id));
        appendParameter(text, "count", std::to_string(row.episode().count));
    }
    text += ']';
    appendFields(text, row, longest / 2);
    text += ' ';
    return text + messageText(textOf(row), longest - std::min(text.size(), longest));
}

} // namespace zrm::host
