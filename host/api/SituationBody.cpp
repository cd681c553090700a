#include "host/api/SituationBody.h"

#include "host/http/JsonFields.h"
#include "host/http/RequestRefused.h"

#include <optional>

namespace zrm::host {

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
    fields.refuseUnknown();
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
