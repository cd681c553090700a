#include "host/silences/Silence.h"

#include "host/base/TimeText.h"
#include "host/silences/Wildcard.h"

#include <array>
#include <chrono>

namespace zrm::host {

namespace {

constexpr std::array severities = {"info", "minor", "warning", "major", "critical"};

/// The time of "2h" or "2026-11-20T07:30"; none for any other text.
std::optional<std::int64_t> timeOf(const std::string& text, std::int64_t now) {
    if (const auto duration = DurationText::parse(text)) {
        return now + std::chrono::milliseconds(*duration).count();
    }
    return TimeText::toMilliseconds(text);
}

Result<std::int64_t> checkUntil(const std::string& text, std::int64_t now) {
    const std::optional<std::int64_t> until = timeOf(text, now);
    if (!until) {
        return refused("'" + text + "' is neither a duration nor a time",
                       "write for example 2h, or 2026-11-20T07:30:00Z", "until");
    }
    if (*until <= now) {
        return refused("'" + text + "' is in the past", "write a time after now, or for example 2h",
                       "until");
    }
    return *until;
}

Result<void> checkSeverity(const std::string& pattern) {
    const Wildcard wildcard(pattern);
    const bool isKnown =
        pattern.empty() || std::any_of(severities.begin(), severities.end(),
                                       [&](const char* one) { return wildcard.matches(one); });
    if (!isKnown) {
        return refused("'" + pattern + "' matches no severity",
                       "write info, minor, warning, major or critical", "match.severity");
    }
    return {};
}

Result<void> checkLength(const std::string& text, const std::string& field) {
    if (text.size() > SilenceRequest::longestText) {
        return refused("has " + std::to_string(text.size()) + " bytes",
                       "write at most " + std::to_string(SilenceRequest::longestText), field);
    }
    return {};
}

Result<void> checkGiven(const std::string& text, const std::string& field) {
    if (text.empty()) {
        return refused("is empty", "write something: others will read it", field);
    }
    return checkLength(text, field);
}

Result<void> checkMatch(const SilenceMatch& match) {
    Result<void> result;
    const auto check = [&result](const std::string& text, const std::string& field) {
        result = result.and_then([&] { return checkLength(text, "match." + field); });
    };
    check(match.situation, "situation");
    check(match.log, "log");
    check(match.severity, "severity");
    check(match.node, "node");
    for (const auto& [name, value] : match.group) {
        check(name, "group");
        check(value, "group." + name);
    }
    if (match.group.size() > SilenceRequest::mostGroups) {
        return refused("has more than " + std::to_string(SilenceRequest::mostGroups) + " names", "",
                       "match.group");
    }
    return result.and_then([&] { return checkSeverity(match.severity); });
}

} // namespace

Result<Silence> SilenceRequest::check(std::int64_t now) const {
    if (match.isAll() && !isAll) {
        return refused("is empty, so it would silence every event",
                       "name a situation, log, severity, node or group, or write \"all\": true",
                       "match");
    }
    if (!match.isAll() && isAll) {
        return refused("every event is silenced, whatever else is named", "leave one out",
                       "match.all");
    }
    const Result<void> texts =
        checkMatch(match).and_then([&] { return checkGiven(who, "who"); }).and_then([&] {
            return checkGiven(why, "why");
        });
    if (!texts) {
        return tl::unexpected(texts.error());
    }
    return checkUntil(until, now).map([&](std::int64_t end) {
        Silence silence;
        silence.match = match;
        silence.created = now;
        silence.until = end;
        silence.who = who;
        silence.why = why;
        return silence;
    });
}

} // namespace zrm::host
