#include "host/diagnose/FollowView.h"

#include "base/ErrorText.h"
#include "host/base/JsonWriter.h"
#include "monitor/FollowLedger.h"

#include <ctime>
#include <optional>
#include <string_view>

namespace zrm::host {

namespace {

std::int64_t milliseconds(const std::timespec& time) {
    return std::int64_t{time.tv_sec} * 1000 + time.tv_nsec / 1'000'000;
}

void writeOrNull(JsonWriter& json, std::string_view key, const std::string& text) {
    json.key(key);
    if (text.empty()) {
        json.null();
    } else {
        json.value(text);
    }
}

/// Leaves the object open.
void writeRange(JsonWriter& json, const FollowView::Range& range) {
    json.beginObject().key("time").time(range.time);
    json.member("from", range.from).member("to", range.to);
}

} // namespace

FollowView FollowView::of(const FollowLedger& ledger) {
    FollowView view;
    view.state = followStateText(ledger.state());
    if (const std::optional<FollowLedger::Failure> failure = ledger.failure()) {
        const ErrorText error(failure->number);
        const std::string file = failure->file.empty() ? "" : " of " + failure->file;
        view.isSource = !failure->text.empty();
        view.problem = !failure->text.empty()
                           ? failure->text
                           : failure->call + file + " failed and is tried again: " + error.text();
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
        view.lost.push_back(
            {milliseconds(range.time), range.from, range.to, range.source, range.text});
    }
    return view;
}

void FollowView::write(JsonWriter& json, bool withRanges) const {
    json.beginObject().member("state", state);
    writeOrNull(json, "problem", problem);
    writeOrNull(json, "generation", generation);
    json.member("generations", generations).member("position", position).member("behind", behind);
    json.member("recovered_bytes", recoveredBytes).member("lost_bytes", lostBytes);
    json.member("cut_entries", cutEntries);
    if (withRanges) {
        json.key("recovered").beginArray();
        for (const Range& range : recovered) {
            writeRange(json, range);
            json.member("source", range.source).endObject();
        }
        json.endArray().key("lost").beginArray();
        for (const Range& range : lost) {
            writeRange(json, range);
            writeOrNull(json, "source", range.source);
            writeOrNull(json, "text", range.text);
            json.endObject();
        }
        json.endArray();
    }
    json.endObject();
}

} // namespace zrm::host
