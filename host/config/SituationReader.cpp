#include "host/config/SituationReader.h"

#include "host/config/Thresholds.h"

#include <algorithm>
#include <array>
#include <optional>
#include <string_view>
#include <utility>
#include <variant>

namespace {

constexpr std::array<std::string_view, 5> severities = {"info", "minor", "warning", "major",
                                                        "critical"};
constexpr std::size_t longestName = 128; ///< bytes

bool isControl(char c) {
    return static_cast<unsigned char>(c) < 0x20 || c == 0x7f;
}

bool isOn(const Condition& condition, std::string_view column) {
    return condition.column == column;
}

} // namespace

SituationReader::SituationReader(ConfigProblems& problems)
    : m_problems(problems), m_parser("RMLOGENT") {}

SituationConfig SituationReader::read(const toml::table& table) {
    SituationConfig situation;
    ConfigSection section("situation", table, m_problems);
    readName(section, situation);
    situation.text = section.text("text").value_or("");
    readSeverity(section, situation);
    readLog(section, situation);
    readConditions(section, situation);
    readThresholds(section, situation);
    section.refuseUnknownKeys();
    return situation;
}

void SituationReader::readName(ConfigSection& section, SituationConfig& situation) {
    const std::optional<std::string> name = section.text("name");
    if (!name) {
        if (!section.has("name")) {
            section.problem("name", "is missing", "give the situation a name");
        }
        return;
    }
    situation.name = *name;
    if (name->empty() || name->size() > longestName ||
        std::any_of(name->begin(), name->end(), isControl)) {
        section.problem("name", "is no usable name",
                        "write 1 to " + std::to_string(longestName) +
                            " bytes without control characters");
        return;
    }
    const auto [first, isNew] = m_names.emplace(*name, section.line("name"));
    if (!isNew) {
        section.problem("name",
                        "'" + *name + "' is the name of the situation at line " +
                            std::to_string(first->second) + " too",
                        "give each situation a name of its own");
    }
}

void SituationReader::readSeverity(ConfigSection& section, SituationConfig& situation) {
    situation.severity = section.text("severity").value_or("warning");
    if (std::find(severities.begin(), severities.end(), situation.severity) == severities.end()) {
        section.problem("severity", "'" + situation.severity + "' is no severity",
                        "write info, minor, warning, major or critical");
    }
}

void SituationReader::readLog(ConfigSection& section, SituationConfig& situation) {
    const std::optional<std::string> log = section.text("log");
    if (!log) {
        return;
    }
    auto conditions = ConditionBuilder::ofLog(*log);
    if (const auto* const problem = std::get_if<ConditionProblem>(&conditions)) {
        section.problem("log", problem->what, problem->cure);
        return;
    }
    situation.conditions = std::move(std::get<std::vector<Condition>>(conditions));
}

void SituationReader::readConditions(ConfigSection& section, SituationConfig& situation) {
    for (const auto& [text, line] : section.texts("when")) {
        ConditionBuilder::Result result = m_parser.parse(text);
        if (const auto* const problem = std::get_if<ConditionProblem>(&result)) {
            section.problem(line, "when", "in \"" + text + "\": " + problem->what, problem->cure);
        } else {
            situation.conditions.push_back(std::move(std::get<Condition>(result)));
        }
    }
}

void SituationReader::readThresholds(ConfigSection& section, SituationConfig& situation) {
    const std::optional<std::string> frequency = section.text("frequency");
    const std::optional<std::string> period = section.text("period");
    const bool inConditions = std::any_of(
        situation.conditions.begin(), situation.conditions.end(), [](const Condition& condition) {
            return isOn(condition, "FREQTHRESH") || isOn(condition, "PERIODTHRS");
        });
    if (inConditions && (section.has("frequency") || section.has("period"))) {
        section.problem("frequency", "the conditions name FREQTHRESH or PERIODTHRS as well",
                        "leave those conditions out");
    }
    if (section.has("frequency") && !section.has("period")) {
        section.problem("frequency", "has no period beside it", "add period = \"60s\"");
    }
    if (section.has("period") && !section.has("frequency")) {
        section.problem("period", "has no frequency beside it", "add frequency = \">= 5\"");
    }
    if (frequency) {
        if (const auto condition = Thresholds::frequency(*frequency)) {
            situation.conditions.push_back(*condition);
        } else {
            section.problem("frequency", "'" + *frequency + "' is no frequency that can be reached",
                            "write >=, >, <= or < and a number of entries, for example \">= 5\"");
        }
    }
    if (period) {
        if (const auto condition = Thresholds::period(*period)) {
            situation.conditions.push_back(*condition);
        } else {
            section.problem("period", "'" + *period + "' is no period",
                            "write a number and s, m, h or d, for example \"60s\"");
        }
    }
}
