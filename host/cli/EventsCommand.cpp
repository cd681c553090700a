#include "host/cli/Commands.h"

#include "host/cli/CliError.h"
#include "host/cli/Context.h"
#include "host/cli/EventFollower.h"
#include "host/cli/EventLines.h"
#include "host/cli/JsonText.h"
#include "host/cli/StopSignals.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <map>
#include <optional>
#include <system_error>
#include <utility>

#include <CLI/CLI.hpp>
#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = JsonText::Json;

constexpr unsigned usualLimit = 100;
constexpr unsigned usualBeforeFollowing = 10;

/// The number of an event; none when it is no such number.
std::optional<std::int64_t> numberOf(const std::string& text) {
    std::int64_t number = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, number);
    return error == std::errc() && stop == end && number >= 0 ? std::optional(number)
                                                              : std::nullopt;
}

std::string problemOfNumber(const std::string& text) {
    return numberOf(text) ? "" : '\'' + text + "' is not the id of an event";
}

struct Found {
    Json events = Json::array(); ///< newest first
    std::uint64_t newest = 0;    ///< the newest id of the whole history
};

/// Events, newest first, in which an episode has one place: that of its latest event. Its beginning
/// says more than its end.
class ByEpisode {
public:
    explicit ByEpisode(Json& events) : m_events(events) {}

    void add(const Json& event) {
        const std::uint64_t episode = EventLines::episodeOf(event);
        if (episode == 0) {
            m_events.push_back(event);
            return;
        }
        const auto [place, isNew] = m_places.emplace(episode, m_events.size());
        if (isNew) {
            m_events.push_back(event);
        } else {
            m_events[place->second] = event;
        }
    }

private:
    Json& m_events;
    std::map<std::uint64_t, std::size_t> m_places;
};

/// The latest events that the query asks for, at most `limit`. A search for a text takes the
/// agent several requests.
Found find(Context& context, std::multimap<std::string, std::string> query, std::size_t limit,
           bool isByEpisode) {
    Found found;
    ByEpisode episodes(found.events);
    std::uint64_t before = UINT64_MAX;
    for (bool isMore = true; isMore && found.events.size() < limit;) {
        query.erase("limit");
        query.emplace("limit", std::to_string(limit - found.events.size()));
        const Json answer = context.client().get("/api/v1/events", query);
        for (const Json& event : JsonText::member(answer, "events")) {
            if (isByEpisode) {
                episodes.add(event);
            } else {
                found.events.push_back(event);
            }
        }
        for (const Json& id : JsonText::member(answer, "damaged")) {
            Context::note("event " + JsonText::text(id) +
                          " is damaged in the history: its content is not what was written");
        }
        found.newest = std::max(found.newest, JsonText::number(answer, "newest"));
        const std::uint64_t next = JsonText::number(answer, "next");
        isMore = next > 0 && next < before;
        before = next;
        query.erase("before");
        query.emplace("before", std::to_string(next));
    }
    return found;
}

/// The episodes of events, by id, as they are now. Those that have expired are missing.
EventLines::Episodes episodesOf(Context& context, const Json& events) {
    constexpr std::size_t atOnce = 100; // the agent takes no more
    std::vector<std::string> ids;
    for (const Json& event : events) {
        if (const std::uint64_t id = EventLines::episodeOf(event); id > 0) {
            ids.push_back(std::to_string(id));
        }
    }
    EventLines::Episodes episodes;
    for (std::size_t begin = 0; begin < ids.size(); begin += atOnce) {
        AgentClient::Query query{{"limit", std::to_string(atOnce)}};
        for (std::size_t at = begin; at < std::min(begin + atOnce, ids.size()); ++at) {
            query.emplace("id", ids[at]);
        }
        const Json answer = context.client().get("/api/v1/episodes", query);
        for (const Json& episode : JsonText::member(answer, "episodes")) {
            episodes.emplace(JsonText::number(episode, "id"), episode);
        }
    }
    return episodes;
}

} // namespace

EventsCommand::EventsCommand(CLI::App& program)
    : m_command(program.add_subcommand("events",
                                       "The events that situations have raised; -f follows them")) {
    const auto anyOf = [&](const char* name, std::vector<std::string>& values, const char* type,
                           const char* help) {
        m_command->add_option(name, values, help)->type_name(type)->allow_extra_args(false);
    };
    m_command->add_flag("-f,--follow", m_follow, "Continue with new events until Ctrl-C");
    m_command->add_flag("--all", m_isAll, "Each event, also the second one of an episode");
    m_command->add_option("--after", m_after, "Events after this one")
        ->type_name("ID")
        ->check(problemOfNumber);
    m_command->add_option("--before", m_before, "Events before this one")
        ->type_name("ID")
        ->check(problemOfNumber);
    m_command->add_option("--from", m_from, "Raised at this time or later")->type_name("TIME");
    m_command->add_option("--to", m_to, "Raised at this time or earlier")->type_name("TIME");
    anyOf("--situation", m_situations, "NAME", "Of this situation; may be repeated");
    anyOf("--log", m_logs, "LOG", "Of this log; may be repeated");
    anyOf("--severity", m_severities, "SEVERITY", "Of this severity; may be repeated");
    m_command->add_option("--silenced", m_silenced, "true: held back by a silence; false: not")
        ->type_name("true|false")
        ->check(CLI::IsMember({"true", "false"}));
    m_command->add_option("--text", m_text, "Containing this text, in upper or lower case")
        ->type_name("TEXT");
    m_command
        ->add_option("--limit", m_limit, "The number of latest events (default 100; with -f 10)")
        ->type_name("COUNT")
        ->check(CLI::Range(1, 1000));
}

bool EventsCommand::isChosen() const {
    return m_command->parsed();
}

std::multimap<std::string, std::string> EventsCommand::filters() const {
    std::multimap<std::string, std::string> query;
    for (const auto& [name, values] :
         {std::pair("situation", &m_situations), std::pair("log", &m_logs),
          std::pair("severity", &m_severities)}) {
        for (const std::string& value : *values) {
            query.emplace(name, value);
        }
    }
    if (!m_silenced.empty()) {
        query.emplace("silenced", m_silenced);
    }
    if (!m_text.empty()) {
        query.emplace("text", m_text);
    }
    return query;
}

CliStatus EventsCommand::list(Context& context) {
    std::multimap<std::string, std::string> query = filters();
    const auto add = [&](const char* name, const std::string& value) {
        if (!value.empty()) {
            query.emplace(name, value);
        }
    };
    add("after", m_after);
    add("before", m_before);
    add("from", m_from.empty() ? "" : Context::time("--from", m_from));
    add("to", m_to.empty() ? "" : Context::time("--to", m_to));
    const bool isByEpisode = !m_isAll && !context.options().json;
    Json events = find(context, query, m_limit > 0 ? m_limit : usualLimit, isByEpisode).events;
    std::reverse(events.begin(), events.end()); // the newest is next to the prompt
    if (events.empty()) {
        Context::note("no such event");
        return CliStatus::REFUSED;
    }
    if (context.options().json) {
        for (const Json& event : events) {
            context.print(JsonText::dump(event, true) + '\n');
        }
    } else if (isByEpisode) {
        context.print(EventLines::table(events, episodesOf(context, events), context.terminal()));
    } else {
        context.print(EventLines::table(events, context.terminal()));
    }
    return CliStatus::DONE;
}

CliStatus EventsCommand::follow(Context& context) {
    if (!m_before.empty() || !m_to.empty()) {
        throw CliError(CliStatus::USAGE,
                       "--before and --to cannot be combined with -f, which has no end");
    }
    StopSignals signals;
    AgentClient& client = context.client();
    std::multimap<std::string, std::string> query = filters();
    const bool isByEpisode = !m_isAll && !context.options().json;
    const auto show = [&](const Json& event) {
        context.print(context.options().json
                          ? JsonText::dump(event, true) + '\n'
                          : EventLines::line(event, context.terminal(), isByEpisode));
    };
    std::uint64_t after = 0;
    if (!m_after.empty()) {
        after = static_cast<std::uint64_t>(*numberOf(m_after));
    } else {
        if (!m_from.empty()) {
            query.emplace("from", Context::time("--from", m_from));
        }
        const Found found =
            find(context, query, m_limit > 0 ? m_limit : usualBeforeFollowing, false);
        std::for_each(found.events.rbegin(), found.events.rend(), show);
        after = found.newest;
    }
    EventFollower follower(client, filters(), signals, &Context::note);
    follower.follow(after, show);
    return CliStatus::DONE;
}

CliStatus EventsCommand::run(Context& context) {
    return m_follow ? follow(context) : list(context);
}

} // namespace zrm::host
