#include "host/api/SuggestResource.h"

#include "base/TraceScope.h"
#include "host/api/TrialLines.h"
#include "host/diagnose/FormatSuggestion.h"
#include "host/diagnose/FormatTrial.h"
#include "host/http/JsonFields.h"
#include "host/http/RequestRefused.h"

#include <optional>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SuggestResource.cpp"};

} // namespace

SuggestResource::SuggestResource(std::vector<std::string> directories)
    : m_formats(std::move(directories)) {}

void SuggestResource::addRoutes(Router& router) {
    router.add("POST", "/api/v1/suggest",
               [this](const HttpRequest& request) { return suggest(request); });
}

HttpAnswer SuggestResource::suggest(const HttpRequest& request) const {
    TraceScope trace(anchor);
    JsonFields fields(request.body);
    const std::string log = fields.optionalText("log").value_or("");
    const auto last = fields.optionalNumber("last", 1, static_cast<std::int64_t>(TrialLines::most));
    const bool hasLines = fields.has("lines");
    std::vector<std::string> lines = TrialLines::given(fields);
    fields.refuseUnknown();
    if (hasLines && last) {
        fields.refuse("last", "write either lines, or log and last");
    }
    if (!hasLines && log.empty()) {
        fields.refuse("lines", "is missing, and so is log");
    }
    if (!hasLines) {
        lines = TrialLines::ofLog(fields, log,
                                  static_cast<std::size_t>(last.value_or(TrialLines::most)));
    }
    const std::string_view name = log.empty() ? FormatTrial::someLog : std::string_view(log);
    return HttpAnswer::json(FormatSuggestion::of(m_formats, std::move(lines), name).json());
}

} // namespace zrm::host
