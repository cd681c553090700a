#include "host/formats/JsonNames.h"

#include <algorithm>
#include <cstddef>
#include <span>

namespace zrm::host {

namespace {

// In the order in which they are tried. They are those of common loggers and of the standards for
// structured logs; a name with dots is also that of a nested field.
constexpr std::string_view timeNames[] = {"time",
                                          "timestamp",
                                          "@timestamp",
                                          "ts",
                                          "@t",
                                          "t",
                                          "t.$date",
                                          "datetime",
                                          "date",
                                          "asctime",
                                          "created",
                                          "created_at",
                                          "eventTime",
                                          "event_time",
                                          "timeUnixNano",
                                          "observedTimeUnixNano",
                                          "timeMillis",
                                          "instant.epochSecond",
                                          "requestReceivedTimestamp",
                                          "time_iso8601",
                                          "time_local",
                                          "__REALTIME_TIMESTAMP"};
constexpr std::string_view systemNames[] = {
    "host",      "hostname",           "host.name",      "host.hostname",
    "_HOSTNAME", "host_name",          "node",           "node.name",
    "nodename",  "node_name",          "machine",        "machineName",
    "server",    "resource.host.name", "agent.hostname", "kubernetes.node_name"};
constexpr std::string_view sourceNames[] = {"logger",        "logger_name",
                                            "loggerName",    "log.logger",
                                            "SourceContext", "Properties.SourceContext",
                                            "name",          "component",
                                            "module",        "@module",
                                            "service",       "service.name",
                                            "service_name",  "resource.service.name",
                                            "app",           "application",
                                            "app_name",      "appname",
                                            "program",       "SYSLOG_IDENTIFIER",
                                            "identifier",    "_COMM",
                                            "target",        "category",
                                            "categoryName",  "subsystem",
                                            "channel",       "caller",
                                            "source",        "source.function",
                                            "eventSource",   "protoPayload.serviceName"};
constexpr std::string_view typeNames[] = {
    "level",     "severity",  "log.level",      "lvl",          "loglevel",
    "log_level", "levelname", "level_name",     "severityText", "severity_text",
    "@level",    "@l",        "error_severity", "PRIORITY",     "stream"};
constexpr std::string_view classNames[] = {"class", "facility", "event_type", "event.category",
                                           "type"};
constexpr std::string_view descriptionNames[] = {"msg",
                                                 "message",
                                                 "@message",
                                                 "@m",
                                                 "short_message",
                                                 "text",
                                                 "RenderedMessage",
                                                 "fields.message",
                                                 "body",
                                                 "body.stringValue",
                                                 "log",
                                                 "event",
                                                 "@mt",
                                                 "MessageTemplate",
                                                 "full_message",
                                                 "description",
                                                 "error",
                                                 "err",
                                                 "error.message",
                                                 "err.message",
                                                 "exception.message",
                                                 "request",
                                                 "textPayload",
                                                 "jsonPayload.message",
                                                 "protoPayload.methodName",
                                                 "eventName",
                                                 "requestURI"};

constexpr std::span<const std::string_view> usualNames(EntryColumn column) {
    switch (column) {
    case EntryColumn::time:
        return timeNames;
    case EntryColumn::system:
        return systemNames;
    case EntryColumn::source:
        return sourceNames;
    case EntryColumn::type:
        return typeNames;
    case EntryColumn::entryClass:
        return classNames;
    case EntryColumn::description:
        break;
    }
    return descriptionNames;
}

} // namespace

JsonNames::JsonNames(const std::map<std::string, std::string>& columns) {
    for (std::size_t i = 0; i < std::size(entryColumnNames); ++i) {
        const auto column = static_cast<EntryColumn>(i);
        if (const auto given = columns.find(std::string(entryColumnNames[i]));
            given != columns.end()) {
            add(column, given->second, 0, false);
            continue;
        }
        std::uint8_t rank = 0;
        for (const std::string_view name : usualNames(column)) {
            add(column, name, rank++, true);
        }
    }
    std::stable_sort(
        m_names.begin(), m_names.end(),
        [](const JsonName& one, const JsonName& other) { return one.place < other.place; });
    for (std::size_t place = 0; place < m_starts.size(); ++place) {
        const auto first =
            std::lower_bound(m_names.begin(), m_names.end(), place,
                             [](const JsonName& one, std::size_t at) { return one.place < at; });
        m_starts[place] = static_cast<std::uint16_t>(first - m_names.begin());
    }
}

void JsonNames::add(EntryColumn column, std::string_view name, std::uint8_t rank, bool isUsual) {
    if (!name.empty()) {
        m_names.push_back({std::string(name), column, rank, isUsual, placeOf(name)});
    }
}

bool JsonNames::isSame(char left, char right) noexcept {
    const bool isLetter = folded(left) >= 'a' && folded(left) <= 'z';
    return left == right || (isLetter && folded(left) == folded(right));
}

bool JsonNames::fits(const JsonName& known, std::string_view name) noexcept {
    return known.text == name || (known.isUsual && std::equal(known.text.begin(), known.text.end(),
                                                              name.begin(), name.end(), isSame));
}

void JsonColumns::clear() noexcept {
    m_best.fill({});
    m_timeCount = 0;
}

void JsonColumns::add(const JsonName& name, std::string_view value, bool isNumber) noexcept {
    if (value.empty()) {
        return;
    }
    if (name.column == EntryColumn::time) {
        addTime({&name, value, isNumber});
        return;
    }
    JsonCandidate& best = m_best[static_cast<std::size_t>(name.column)];
    if (best.name == nullptr || name.rank < best.name->rank) {
        best = {&name, value, isNumber};
    }
}

void JsonColumns::addTime(const JsonCandidate& candidate) noexcept {
    std::size_t at = m_timeCount;
    if (at < mostTimes) {
        ++m_timeCount;
    } else if (candidate.name->rank < m_times[mostTimes - 1].name->rank) {
        at = mostTimes - 1;
    } else {
        return;
    }
    for (; at > 0 && candidate.name->rank < m_times[at - 1].name->rank; --at) {
        m_times[at] = m_times[at - 1];
    }
    m_times[at] = candidate;
}

} // namespace zrm::host
