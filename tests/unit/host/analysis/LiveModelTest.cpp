// Random entries and random situations: what a replay and the verdicts on conditions say of an
// entry is what monitoring makes of it.

#include "host/analysis/ConditionVerdict.h"
#include "host/analysis/Replay.h"

#include "framework/ctreq.h"
#include "host/config/ConditionParser.h"
#include "host/config/SituationValidator.h"
#include "host/events/EventQueue.h"
#include "host/framework/Request.h"
#include "host/situations/SituationSet.h"
#include "logs/EntryClock.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "tables/zrm_rmlogent_manager.h"
#include "unit/host/analysis/TestLog.h"
#include "unit/host/framework/Conditions.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <map>
#include <memory>
#include <optional>
#include <random>
#include <string>
#include <variant>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using Random = std::mt19937;

template <typename T> const T& pick(Random& random, const std::vector<T>& choices) {
    return choices[random() % choices.size()];
}

const std::vector<std::string> columns = {"ENTRYSYS",   "ENTRYSRC",  "ENTRYTYPE", "ENTRYCLASS",
                                          "ENTRYDESC",  "UENTRYSRC", "LOGPATH",   "LOGNAME",
                                          "UENTRYDESC", "ENTRYTIME", "ULOGPATH"};
const std::vector<std::string> numbers = {"SAMPLENO", "ROWNO"};

/// Few and like each other, so that conditions hold often.
std::string randomText(Random& random) {
    static const std::vector<std::string> pieces = {"a", "a",  "ab", " ",         "it's",
                                                    "b", "\t", "ü",  "/var/log/", "app.log"};
    std::string text;
    for (std::size_t count = random() % 4; count > 0; --count) {
        text += pick(random, pieces);
    }
    return random() % 30 == 0 ? text + std::string(300, 'a') : text;
}

std::string quoted(const std::string& text) {
    std::string result = "'";
    for (const char c : text) {
        result += c == '\'' ? "''" : std::string(1, c);
    }
    return result + "'";
}

std::string anyCondition(Random& random) {
    static const std::vector<std::string> relations = {"=", "!=", ">=", "<=", "<", ">"};
    if (random() % 5 == 0) {
        const std::string number = std::to_string(random() % 4);
        return pick(random, numbers) + ' ' +
               (random() % 4 == 0 ? "in [0, " + number + ", 60]"
                                  : pick(random, relations) + ' ' + number);
    }
    const std::string& column = pick(random, columns);
    switch (random() % 5) {
    case 0:
        return column + " contains " + quoted(randomText(random) + "a");
    case 1:
        return column + " starts " + quoted(randomText(random) + "a");
    case 2:
        return column + " matches " +
               quoted(pick(random, std::vector<std::string>{"^a", "b$", "a.*b", "^$", "[ab]+"}));
    case 3:
        return column + " in [" + quoted(randomText(random)) + ", " + quoted(randomText(random)) +
               ", 'a']";
    default:
        return column + ' ' + pick(random, relations) + ' ' + quoted(randomText(random));
    }
}

/// One that its column can hold.
std::string randomCondition(Random& random) {
    const ConditionParser parser("RMLOGENT");
    for (;;) {
        std::string condition = anyCondition(random);
        if (parser.parse(condition)) {
            return condition;
        }
    }
}

const std::vector<Condition> inertThresholds = {
    numberCondition("FREQTHRESH", INTF_GREATER_OR_EQUAL, 1),
    numberCondition("FREQTHRESH", INTF_LESS, 1), numberCondition("FREQTHRESH", INTF_EQUAL, 3),
    numberCondition("PERIODTHRS", INTF_EQUAL, 0), numberCondition("PERIODTHRS", INTF_EQUAL, 60)};

SituationConfig randomSituation(Random& random, std::size_t number) {
    SituationText text;
    text.name = "situation " + std::to_string(number);
    for (std::size_t count = random() % 3; count > 0; --count) {
        text.when.push_back(randomCondition(random));
    }
    if (random() % 3 == 0) {
        text.log = random() % 2 == 0 ? "/var/log/app.log" : "/var/log/other.log";
    }
    const auto kind = random() % 4;
    if (kind == 0) {
        text.when.insert(text.when.end(), {"FREQTHRESH >= 2", "PERIODTHRS = 30"});
    } else if (kind < 3) {
        text.frequency =
            pick(random, std::vector<std::string>{">= ", "> ", "<= ", "< "}) +
            pick(random, std::vector<std::string>{"1", "2", "2", "3", "5", "2147483646"});
        text.period =
            pick(random, std::vector<std::string>{"1s", "30s", "60s", "1m", "1h", "365d"});
        if (text.frequency == "< 1") {
            text.frequency = "< 2"; // the other cannot be reached, and is refused
        }
    }
    auto [config, problems] = SituationValidator::check(text);
    for (const SituationProblem& problem : problems) {
        ADD_FAILURE() << problem.field << ": " << problem.text();
    }
    if (kind == 3) { // refused when somebody writes it; the agent takes it for no threshold
        config.conditions.push_back(pick(random, inertThresholds));
    }
    return config;
}

zrm_rmlogent_data_t randomRow(Random& random, int seconds) {
    zrm_rmlogent_data_t row = rowAt(seconds, randomText(random));
    const auto put = [](auto& column, const std::string& text) {
        text.copy(column, sizeof column);
    };
    put(row.entrysys, randomText(random));
    put(row.entrysrc, randomText(random));
    put(row.uentrysrc, randomText(random));
    put(row.entrytype, randomText(random));
    put(row.entryclass, randomText(random));
    put(row.uentrydesc, randomText(random));
    put(row.logpath, "/var/log/");
    put(row.ulogpath, "/var/log/");
    const std::string name = random() % 2 == 0 ? "app.log" : "other.log";
    put(row.logname, name);
    put(row.ulogname, name);
    if (random() % 10 == 0) {
        row.entrydesc[random() % 4] = '\0';
    }
    if (random() % 15 == 0) {
        put(row.entrytime, "                "); // a time that is none
    }
    row.sampleno = static_cast<std::int32_t>(random() % 3);
    row.rowno = static_cast<std::int32_t>(random() % 3);
    return row;
}

class NoReceiver : public RowReceiver {
public:
    unsigned receive(const ctreq&, const char*, unsigned) override { return 0; }
    void stopped(const ctreq&, unsigned) override {}
};

class LiveModel : public testing::Test {
protected:
    /// The counts of the situations that an entry raises.
    std::map<std::string, std::int32_t> raisedBy(zrm_rmlogent_data_t row) {
        entries.AddDataToEvent(&row, 1);
        std::map<std::string, std::int32_t> raised;
        while (queue.backlog(reader) > 0) {
            const auto event = queue.read(reader, 1)[0];
            zrm_rmlogent_data_t dispatched;
            std::memcpy(&dispatched, event.row, sizeof dispatched);
            raised[event.situation->name] = dispatched.freqthresh;
            queue.release(reader, 1);
        }
        return raised;
    }

    void compare(const SituationConfig& config, Replay& replay, zrm_rmlogent_data_t row,
                 const std::map<std::string, std::int32_t>& raised) {
        const Replay::Verdict verdict = replay.judge(row);
        zrm_rmlogent_data_t judged = row;
        EXPECT_EQ(replay.matches(judged), verdict.matches);
        bool allHold = true;
        std::vector<Condition> conditions = config.conditions;
        std::erase_if(conditions, [](const Condition& condition) {
            return isThresholdColumn(condition.column);
        });
        const ConditionJudge judge(std::move(conditions), replay.layout());
        for (const ConditionVerdict& one : judge.judge(reinterpret_cast<char*>(&judged))) {
            EXPECT_EQ(one.holds, one.refusal.empty());
            allHold = allHold && one.holds;
        }
        EXPECT_EQ(allHold, verdict.matches);
        EXPECT_EQ(columnsHold(config, reinterpret_cast<char*>(&judged)), verdict.matches);
        const auto found = raised.find(config.name);
        EXPECT_EQ(found != raised.end(), verdict.isRaised);
        if (found != raised.end()) {
            EXPECT_EQ(found->second, verdict.frequency.value_or(0));
        }
    }

    /// Whether the table says of every condition, one by one, that the row's column meets it.
    bool columnsHold(const SituationConfig& config, char* row) {
        RequestDetail detail;
        detail.name = config.name;
        detail.sampleType = SAMPLE_SITUATION;
        detail.conditions = config.conditions;
        NoReceiver receiver;
        ContextInfo context(receiver);
        const std::unique_ptr<ctreq> request(entries.CreateCtreq(&detail, &context));
        SEL1_FILTERINFO* filter = nullptr;
        request->ResetFilterIndex();
        while (request->GetFilterInfo(&filter) == 0) {
            if (!isThresholdColumn(filter->columnName) &&
                request->ColumnIsException(row, const_cast<char*>(filter->columnName),
                                           filter->compareOperator,
                                           const_cast<char*>(filter->value)) == 0) {
                return false;
            }
        }
        return true;
    }

    RecordingTrace trace{0};
    zrm_rmlogent_manager entries{"ZRM", "RMLOGENT"};
    EventQueue queue{64, sizeof(zrm_rmlogent_data_t)};
    EventQueue::Reader reader = queue.addReader();
};

TEST_F(LiveModel, AReplayAgreesWithMonitoring) {
    const char* const given = std::getenv("ZRM_TEST_SEED");
    const unsigned seed =
        given != nullptr ? static_cast<unsigned>(std::atol(given)) : std::random_device{}();
    SCOPED_TRACE("ZRM_TEST_SEED=" + std::to_string(seed));
    Random random(seed);
    std::size_t raisedInAll = 0;
    for (int round = 0; round < 15 && !HasFailure(); ++round) {
        SituationSet live(entries, queue);
        std::vector<SituationConfig> configs;
        std::vector<std::unique_ptr<Replay>> replays;
        for (std::size_t number = 0; number < 12; ++number) {
            configs.push_back(randomSituation(random, number));
            replays.push_back(std::make_unique<Replay>(configs.back(), entries));
        }
        live.apply(configs);
        const bool isFollowed = round % 2 == 1;
        int seconds = 0;
        FakeClock clock(1'700'000'000);
        for (int count = 0; count < 60 && !HasFailure(); ++count) {
            seconds += static_cast<int>(random() % 3 == 0 ? random() % 40 : random() % 2);
            clock.set(1'700'000'000 + seconds);
            const zrm_rmlogent_data_t row = randomRow(random, seconds);
            std::optional<EntryInstant> instant; // of a followed log, also late and out of order
            if (isFollowed) {
                const int late = random() % 4 == 0 ? static_cast<int>(random() % 200) - 50 : 0;
                instant.emplace(1'700'000'000 + seconds - late);
            }
            const auto raised = raisedBy(row);
            raisedInAll += raised.size();
            for (std::size_t number = 0; number < configs.size(); ++number) {
                std::string when;
                for (const std::string& condition : configs[number].when) {
                    when += condition + " & ";
                }
                SCOPED_TRACE(configs[number].name + ": " + when +
                             configs[number].frequency.value_or("") + " within " +
                             configs[number].period.value_or(""));
                compare(configs[number], *replays[number], row, raised);
            }
        }
        for (std::size_t number = 0; number < configs.size(); ++number) {
            const SituationStatus status = *live.find(configs[number].name);
            EXPECT_EQ(status.offered, 60u);
        }
    }
    EXPECT_GT(raisedInAll, 300u) << "else hardly anything was compared";
}

} // namespace
