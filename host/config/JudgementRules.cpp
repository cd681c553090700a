#include "host/config/JudgementRules.h"

#include "host/base/TimeText.h"
#include "host/config/EntryNames.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

namespace {

using Problems = std::vector<Problem>;

/// The duration in seconds; 0 if there is none or it is wrong.
std::int64_t durationOf(const char* field, const std::optional<std::string>& text,
                        Problems& problems) {
    if (!text) {
        return 0;
    }
    const auto length = DurationText::parse(*text);
    if (!length) {
        problems.push_back({"'" + *text + "' is not a duration of a second or more",
                            "write a number and s, m, h or d, for example \"15m\"", field});
        return 0;
    }
    return length->count();
}

/// Takes the threshold out of the conditions, where it is one.
void takeThreshold(const Condition& condition, JudgementConfig& rules) {
    if (condition.column == "PERIODTHRS") {
        rules.period = condition.number;
        return;
    }
    const bool isOpen = condition.op == INTF_GREATER || condition.op == INTF_LESS;
    rules.isUpperBound = condition.op == INTF_LESS || condition.op == INTF_LESS_OR_EQUAL;
    rules.frequency = condition.number + (isOpen ? (rules.isUpperBound ? -1 : 1) : 0);
}

void checkName(const char* field, const std::string& name, const EntryNames& names,
               Problems& problems) {
    if (const Result<EntryName> found = names.find(name); !found) {
        problems.push_back({found.error().what, found.error().cure, field});
    }
}

void checkGroups(const JudgementText& text, const EntryNames& names, Problems& problems) {
    for (auto name = text.groupBy.begin(); name != text.groupBy.end(); ++name) {
        checkName("group_by", *name, names, problems);
        if (std::find(text.groupBy.begin(), name, *name) != name) {
            problems.push_back({"'" + *name + "' is there twice", "write it once", "group_by"});
        }
    }
    if (text.groupBy.size() > JudgementRules::mostNames) {
        problems.push_back({"has " + std::to_string(text.groupBy.size()) + " names",
                            "write at most " + std::to_string(JudgementRules::mostNames),
                            "group_by"});
    }
    if (!text.maxGroups) {
        return;
    }
    if (text.groupBy.empty()) {
        problems.push_back({"has no effect without group_by", "leave it out", "max_groups"});
    } else if (*text.maxGroups < 1 || *text.maxGroups > JudgementRules::mostGroups) {
        problems.push_back(
            {std::to_string(*text.maxGroups) + " is not a usable number of groups",
             "write a number from 1 to " + std::to_string(JudgementRules::mostGroups),
             "max_groups"});
    }
}

void checkThen(const JudgementText& text, const JudgementConfig& rules, const EntryNames& names,
               Problems& problems) {
    if (!text.then) {
        return;
    }
    const std::size_t sign = text.then->find('=');
    if (sign == 0 || sign == std::string::npos) {
        problems.push_back({"'" + *text.then + "' is not a name and a value",
                            "write NAME=VALUE, for example \"result=Accepted\"", "then"});
        return;
    }
    checkName("then", text.then->substr(0, sign), names, problems);
    if (!text.absent && (rules.frequency == 0 || rules.period == 0)) {
        problems.push_back({"has no effect without frequency and period",
                            "add how many entries come before: frequency = \">= 5\" and "
                            "period = \"10m\"",
                            "then"});
    }
}

/// What says when entries raise an event says nothing about entries that do not come.
void checkAbsence(const JudgementText& text, const JudgementConfig& rules, Problems& problems) {
    if (!text.absent) {
        return;
    }
    for (const auto& [field, isGiven] :
         {std::pair("frequency", rules.frequency > 0 || rules.period > 0),
          std::pair("distinct", text.distinct.has_value()),
          std::pair("then", text.then.has_value()),
          std::pair("resolve_after", text.resolveAfter.has_value()),
          std::pair("cooldown", text.cooldown.has_value())}) {
        if (isGiven) {
            problems.push_back({"has no effect with absent, which raises one event when no entry "
                                "has come and resolves it with the next entry",
                                "leave one of the two out, or write a second situation", field});
        }
    }
}

} // namespace

JudgementConfig JudgementRules::check(const JudgementText& text, std::vector<Condition>& conditions,
                                      Problems& problems) {
    JudgementConfig rules;
    rules.groupBy = text.groupBy;
    rules.distinct = text.distinct.value_or("");
    rules.then = text.then.value_or("");
    rules.resolveAfter = durationOf("resolve_after", text.resolveAfter, problems);
    rules.cooldown = durationOf("cooldown", text.cooldown, problems);
    rules.resolveAfterText = text.resolveAfter.value_or("");
    rules.cooldownText = text.cooldown.value_or("");
    rules.absent = durationOf("absent", text.absent, problems);
    rules.absentText = text.absent.value_or("");
    if (rules.isUsed()) {
        std::erase_if(conditions, [&rules](const Condition& condition) {
            const bool isThreshold = isThresholdColumn(condition.column);
            if (isThreshold) {
                takeThreshold(condition, rules);
            }
            return isThreshold;
        });
    }
    const EntryNames names(conditions);
    checkGroups(text, names, problems);
    rules.maxGroups = static_cast<std::size_t>(std::clamp<std::int64_t>(
        text.maxGroups.value_or(JudgementConfig::usualGroups), 1, mostGroups));
    checkThen(text, rules, names, problems);
    checkAbsence(text, rules, problems);
    if (text.distinct) {
        checkName("distinct", *text.distinct, names, problems);
        if (!text.absent && (rules.frequency == 0 || rules.period == 0)) {
            problems.push_back({"has no effect without frequency and period",
                                "add frequency = \">= 5\" and period = \"60s\"", "distinct"});
        }
    }
    if (!text.absent && text.resolveAfter && text.cooldown) {
        problems.push_back({"has no effect with resolve_after, which raises one event per episode",
                            "leave one of the two out", "cooldown"});
    }
    return rules;
}

} // namespace zrm::host
