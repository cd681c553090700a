#include "host/diagnose/FollowView.h"

#include "base/ErrorText.h"
#include "host/base/UtcTime.h"
#include "monitor/FollowLedger.h"

#include <ctime>
#include <optional>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

std::int64_t milliseconds(const std::timespec& time) {
    return std::int64_t{time.tv_sec} * 1000 + time.tv_nsec / 1'000'000;
}

} // namespace

FollowView FollowView::of(const FollowLedger& ledger) {
    FollowView view;
    view.state = followStateText(ledger.state());
    if (const std::optional<FollowLedger::Failure> failure = ledger.failure()) {
        const ErrorText error(failure->number);
        view.problem = std::string(failure->call) + " failed and is tried again: " + error.text();
    }
    if (const std::optional<FollowLedger::Generation> generation = ledger.generation()) {
        view.generation = generation->path;
    }
    view.generations = ledger.generations();
    view.position = ledger.position();
    view.behind = ledger.behind();
    view.recoveredBytes = ledger.recoveredBytes();
    view.lostBytes = ledger.lostBytes();
    view.cutEntries = ledger.cutEntries();
    for (const FollowLedger::Recovered& range : ledger.recovered()) {
        view.recovered.push_back({milliseconds(range.time), range.from, range.to, range.source});
    }
    for (const FollowLedger::Lost& range : ledger.lost()) {
        view.lost.push_back({milliseconds(range.time), range.from, range.to, ""});
    }
    return view;
}

nlohmann::ordered_json FollowView::json(bool withRanges) const {
    using Json = nlohmann::ordered_json;
    const auto orNull = [](const std::string& text) { return text.empty() ? Json() : Json(text); };
    Json object{{"state", state},
                {"problem", orNull(problem)},
                {"generation", orNull(generation)},
                {"generations", generations},
                {"position", position},
                {"behind", behind},
                {"recovered_bytes", recoveredBytes},
                {"lost_bytes", lostBytes},
                {"cut_entries", cutEntries}};
    if (withRanges) {
        object["recovered"] = Json::array();
        for (const Range& range : recovered) {
            object["recovered"].push_back({{"time", UtcTime::text(range.time)},
                                           {"from", range.from},
                                           {"to", range.to},
                                           {"source", range.source}});
        }
        object["lost"] = Json::array();
        for (const Range& range : lost) {
            object["lost"].push_back(
                {{"time", UtcTime::text(range.time)}, {"from", range.from}, {"to", range.to}});
        }
    }
    return object;
}

} // namespace zrm::host
