#include "host/api/SituationBody.h"

#include "host/config/SourceConfig.h"
#include "host/http/JsonFields.h"
#include "host/http/RequestRefused.h"
#include "logs/FurtherLogs.h"

#include <algorithm>
#include <optional>

namespace zrm::host {

namespace {

/// A name that no log has would be a situation that is never raised.
void checkLog(const JsonFields& fields, const std::string& log) {
    const auto logs = FurtherLogs::published();
    const bool isKnown =
        logs != nullptr && std::any_of(logs->begin(), logs->end(),
                                       [&log](const FurtherLog& one) { return one.name == log; });
    if (isSourceName(log) && !isKnown) {
        throw RequestRefused(
            400, {"'" + log + "' is not the absolute path of a file, and no log has this name",
                  "begin a path with '/', or name a log of type journal or command",
                  fields.place("log")});
    }
}

} // namespace

SituationText SituationBody::text(JsonFields& fields, const std::string& name) {
    SituationText text;
    text.name = fields.optionalText("name");
    if (!text.name && !name.empty()) {
        text.name = name;
    }
    text.text = fields.optionalText("text");
    text.severity = fields.optionalText("severity");
    text.log = fields.optionalText("log");
    text.when = fields.texts("when", SituationValidator::mostConditions);
    text.frequency = fields.optionalText("frequency");
    text.period = fields.optionalText("period");
    if (fields.has("context")) {
        text.context = fields.number("context", 0, SituationValidator::mostContext);
    }
    text.runbook = fields.optionalText("runbook");
    if (std::optional<JsonFields> labels = fields.optionalObject("labels")) {
        for (const std::string& name : labels->keys()) {
            text.labels[name] = labels->text(name);
        }
    }
    text.judgement.groupBy = fields.texts("group_by", JudgementRules::mostNames);
    if (fields.has("max_groups")) {
        text.judgement.maxGroups = fields.number("max_groups", 1, JudgementRules::mostGroups);
    }
    text.judgement.distinct = fields.optionalText("distinct");
    text.judgement.then = fields.optionalText("then");
    text.judgement.resolveAfter = fields.optionalText("resolve_after");
    text.judgement.cooldown = fields.optionalText("cooldown");
    text.judgement.absent = fields.optionalText("absent");
    fields.refuseUnknown();
    if (text.log) {
        checkLog(fields, *text.log);
    }
    return text;
}

SituationConfig SituationBody::situation(JsonFields& fields, const std::string& name) {
    auto [situation, problems] = SituationValidator::check(text(fields, name));
    if (!problems.empty()) {
        const SituationProblem& first = problems.front();
        throw RequestRefused(400, {first.what, first.cure, fields.place(first.field)});
    }
    return std::move(situation);
}

} // namespace zrm::host
