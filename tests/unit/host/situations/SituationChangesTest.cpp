// The situations as the API sees and changes them.

#include "host/config/SituationValidator.h"
#include "host/situations/SituationJson.h"
#include "host/situations/SituationSet.h"

#include "host/events/EventQueue.h"
#include "logs/zrm_rmlogent_data.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "tables/zrm_rmlogent_manager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <cstring>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

SituationConfig situation(const std::string& name, std::vector<std::string> when = {},
                          const std::string& severity = "minor") {
    SituationText text;
    text.name = name;
    text.when = std::move(when);
    text.severity = severity;
    const auto [config, problems] = SituationValidator::check(text);
    EXPECT_THAT(problems, IsEmpty());
    return config;
}

const SituationStatus& done(const SituationSet::Change& change) {
    return change.value();
}

SituationRefusal::Reason refused(const SituationSet::Change& change) {
    return change.error().reason;
}

class SituationChanges : public testing::Test {
protected:
    SituationChanges() { begin(); }

    /// As in a new process.
    void begin() {
        set.reset();
        set = std::make_unique<SituationSet>(entries, queue, directory.file("situations.json"));
        EXPECT_EQ(set->load(), "");
    }
    /// The situations that an entry of this source raises.
    std::vector<std::string> raisedBy(const std::string& source) {
        zrm_rmlogent_data_t row;
        std::memset(&row, ' ', sizeof row);
        source.copy(row.entrysrc, sizeof row.entrysrc);
        entries.AddDataToEvent(&row, 1);
        std::vector<std::string> names;
        while (queue.backlog(reader) > 0) {
            names.push_back(queue.read(reader, 1)[0].situation->name);
            queue.release(reader, 1);
        }
        return names;
    }
    std::vector<std::string> names() const {
        std::vector<std::string> names;
        for (const SituationStatus& status : set->list()) {
            names.push_back(status.config.name);
        }
        return names;
    }

    RecordingTrace trace{TRC1_ERROR};
    TemporaryDirectory directory;
    zrm_rmlogent_manager entries{"ZRM", "RMLOGENT"};
    EventQueue queue{64, sizeof(zrm_rmlogent_data_t)};
    EventQueue::Reader reader = queue.addReader();
    std::unique_ptr<SituationSet> set;
};

TEST_F(SituationChanges, TakeEffectBeforeTheCallReturns) {
    EXPECT_EQ(done(set->add(situation("a"))).state, SituationStatus::RUNNING);
    EXPECT_THAT(raisedBy("x"), ElementsAre("a"));
    EXPECT_EQ(done(set->replace(situation("a", {"ENTRYSRC = 'y'"}))).config.when.size(), 1u);
    EXPECT_THAT(raisedBy("x"), IsEmpty());
    EXPECT_THAT(raisedBy("y"), ElementsAre("a"));
    EXPECT_EQ(done(set->stop("a")).state, SituationStatus::STOPPED);
    EXPECT_THAT(raisedBy("y"), IsEmpty());
    EXPECT_EQ(done(set->start("a")).state, SituationStatus::RUNNING);
    EXPECT_THAT(raisedBy("y"), ElementsAre("a"));
    EXPECT_TRUE(set->remove("a"));
    EXPECT_THAT(raisedBy("y"), IsEmpty());
    EXPECT_FALSE(set->find("a"));
}

TEST_F(SituationChanges, LimitTheirRegularExpressionsTogether) {
    SituationConfig large = situation("a");
    large.patternSize = PatternBudget::ofSource / 2 + 1;
    EXPECT_EQ(done(set->add(large)).state, SituationStatus::RUNNING);
    large.name = "b";
    EXPECT_EQ(refused(set->add(large)), SituationRefusal::TOO_MANY);
    EXPECT_THAT(names(), ElementsAre("a"));
    EXPECT_EQ(done(set->add(situation("b"))).state, SituationStatus::RUNNING);
    EXPECT_EQ(refused(set->replace(large)), SituationRefusal::TOO_MANY);
    EXPECT_EQ(set->find("b")->config.patternSize, 0u);
    EXPECT_TRUE(set->remove("a"));
    EXPECT_EQ(done(set->replace(large)).state, SituationStatus::RUNNING);
}

TEST_F(SituationChanges, SurviveTheProcess) {
    set->apply({situation("filed")});
    set->add(situation("a"));
    set->add(situation("b"));
    set->stop("filed");
    set->stop("b");
    begin();
    set->apply({situation("filed"), situation("other")});
    EXPECT_THAT(names(), ElementsAre("filed", "other", "a", "b"));
    EXPECT_THAT(raisedBy("x"), testing::UnorderedElementsAre("other", "a"));
    EXPECT_EQ(set->find("filed")->state, SituationStatus::STOPPED);
    set->start("filed");
    set->remove("a");
    begin();
    set->apply({situation("filed"), situation("other")});
    EXPECT_THAT(raisedBy("x"), testing::UnorderedElementsAre("filed", "other"));
}

TEST_F(SituationChanges, ASituationThatReturnsToTheFileIsNoLongerStopped) {
    set->apply({situation("filed")});
    set->stop("filed");
    set->apply({});
    set->apply({situation("filed")});
    EXPECT_EQ(set->find("filed")->state, SituationStatus::RUNNING);
    set->stop("filed");
    begin();
    set->apply({}); // removed while no agent ran
    set->apply({situation("filed")});
    EXPECT_EQ(set->find("filed")->state, SituationStatus::RUNNING);
    set->stop("filed");
    set->apply({situation("filed", {}, "major")});
    EXPECT_EQ(set->find("filed")->state, SituationStatus::STOPPED) << "although it has changed";
}

TEST_F(SituationChanges, ASituationThatReturnsToTheFileIsNoLongerStoppedAfterARestart) {
    set->apply({situation("filed"), situation("other")});
    set->stop("filed");
    set->stop("other");
    set->apply({situation("other")});
    set->apply({situation("filed"), situation("other")});
    begin();
    set->apply({situation("filed"), situation("other")});
    EXPECT_EQ(set->find("filed")->state, SituationStatus::RUNNING);
    EXPECT_EQ(set->find("other")->state, SituationStatus::STOPPED);
}

TEST_F(SituationChanges, ApplyingAFileAgainSavesNothing) {
    set->apply({situation("filed")});
    set->stop("filed");
    const Fault fault("open", EIO);
    set->apply({situation("filed"), situation("other")});
    EXPECT_EQ(set->find("filed")->state, SituationStatus::STOPPED);
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(SituationChanges, ARemovedSituationOfTheFileIsForgottenEvenWhenThatCannotBeSaved) {
    set->apply({situation("filed")});
    set->stop("filed");
    {
        const Fault fault("write", ENOSPC);
        set->apply({});
        EXPECT_THAT(trace.messages(), ElementsAre("The situations cannot be saved: cannot write " +
                                                  directory.file("situations.json.new") +
                                                  ": No space left on device."));
    }
    set->apply({situation("filed")}); // saves what could not be saved before
    begin();
    set->apply({situation("filed")});
    EXPECT_EQ(set->find("filed")->state, SituationStatus::RUNNING);
}

TEST_F(SituationChanges, AReplacementOfAnotherVersionIsRefused) {
    set->add(situation("a"));
    const std::string first = SituationJson::version(situation("a"));
    EXPECT_EQ(refused(set->replace(situation("a", {}, "major"), "0123456789abcdef")),
              SituationRefusal::CHANGED);
    EXPECT_EQ(done(set->replace(situation("a", {}, "major"), first)).config.severity, "major");
    const auto second = set->replace(situation("a", {}, "critical"), first);
    EXPECT_EQ(refused(second), SituationRefusal::CHANGED);
    EXPECT_EQ(second.error().problem.field, "version");
    EXPECT_EQ(set->find("a")->config.severity, "major");
    begin();
    set->load();
    const std::string now = SituationJson::version(situation("a", {}, "major"));
    EXPECT_NE(now, first);
    EXPECT_EQ(done(set->replace(situation("a", {}, "info"), now)).config.severity, "info");
}

TEST_F(SituationChanges, AreRefusedWithTheReason) {
    set->apply({situation("filed")});
    set->add(situation("a"));
    EXPECT_EQ(refused(set->add(situation("a"))), SituationRefusal::EXISTS);
    EXPECT_EQ(refused(set->add(situation("filed"))), SituationRefusal::EXISTS);
    EXPECT_EQ(refused(set->replace(situation("filed"))), SituationRefusal::FROM_FILE);
    EXPECT_EQ(refused(set->replace(situation("none"))), SituationRefusal::UNKNOWN);
    EXPECT_EQ(set->remove("filed").error().reason, SituationRefusal::FROM_FILE);
    EXPECT_EQ(set->remove("none").error().reason, SituationRefusal::UNKNOWN);
    EXPECT_EQ(refused(set->start("none")), SituationRefusal::UNKNOWN);
    EXPECT_EQ(refused(set->stop("none")), SituationRefusal::UNKNOWN);
    EXPECT_THAT(names(), ElementsAre("filed", "a"));
}

TEST_F(SituationChanges, AreNotMadeWhenTheyCannotBeSaved) {
    set->add(situation("a"));
    const auto refusedForDisk = [&](auto change) {
        const Fault fault("write", ENOSPC);
        const SituationSet::Change result = change();
        return result.error();
    };
    for (const SituationRefusal& refusal :
         {refusedForDisk([&] { return set->add(situation("b")); }),
          refusedForDisk([&] { return set->replace(situation("a", {"ENTRYSRC = 'y'"})); }),
          refusedForDisk([&] { return set->stop("a"); }),
          refusedForDisk([&]() -> SituationSet::Change {
              return tl::unexpected(set->remove("a").error());
          })}) {
        EXPECT_EQ(refusal.reason, SituationRefusal::NOT_SAVED);
        EXPECT_THAT(refusal.problem.what, HasSubstr("was not made: cannot write "));
        EXPECT_THAT(refusal.problem.what, HasSubstr("No space left on device"));
    }
    EXPECT_THAT(names(), ElementsAre("a"));
    EXPECT_THAT(raisedBy("x"), ElementsAre("a"));
    begin();
    set->apply({});
    EXPECT_THAT(raisedBy("x"), ElementsAre("a"));
}

TEST_F(SituationChanges, TheFilesSituationHidesOneOfTheSameName) {
    set->add(situation("a", {}, "minor"));
    set->apply({situation("a", {}, "critical")});
    EXPECT_THAT(raisedBy("x"), ElementsAre("a"));
    const auto all = set->list();
    ASSERT_EQ(all.size(), 2u);
    EXPECT_EQ(all[0].source, SituationStatus::FILE);
    EXPECT_EQ(all[0].state, SituationStatus::RUNNING);
    EXPECT_EQ(all[1].source, SituationStatus::API);
    EXPECT_EQ(all[1].state, SituationStatus::FAILED);
    EXPECT_THAT(all[1].problem, HasSubstr("the configuration file has a situation of this name"));
    EXPECT_EQ(set->find("a")->config.severity, "critical");
    // It still waits after a change.
    EXPECT_EQ(done(set->replace(situation("a", {}, "info"))).state, SituationStatus::FAILED);
    EXPECT_THAT(raisedBy("x"), ElementsAre("a"));
    // A stop applies to the file's situation.
    set->stop("a");
    EXPECT_THAT(raisedBy("x"), IsEmpty());
    set->apply({});
    EXPECT_EQ(set->find("a")->state, SituationStatus::RUNNING);
    EXPECT_EQ(set->find("a")->config.severity, "info");
    EXPECT_THAT(raisedBy("x"), ElementsAre("a"));
}

TEST_F(SituationChanges, CountsStartOverOnlyWithAnotherDefinition) {
    set->add(situation("a"));
    raisedBy("x");
    EXPECT_EQ(set->find("a")->raised, 1u);
    EXPECT_EQ(done(set->replace(situation("a"))).raised, 1u);
    set->stop("a");
    raisedBy("x");
    set->start("a");
    raisedBy("x");
    const SituationStatus status = *set->find("a");
    EXPECT_EQ(status.offered, 2u);
    EXPECT_EQ(status.matched, 2u);
    EXPECT_EQ(status.discarded, 0u);
    EXPECT_EQ(status.raised, 2u);
    EXPECT_NE(status.lastRaised, 0);
    EXPECT_EQ(done(set->replace(situation("a", {}, "info"))).raised, 0u);
    EXPECT_EQ(set->find("a")->lastRaised, 0);
}

TEST_F(SituationChanges, TheirNumberIsLimited) {
    std::string text = R"({"version":1,"stopped":[],"situations":[)";
    for (std::size_t number = 0; number < SituationSet::mostMade; ++number) {
        text += (number == 0 ? "" : ",") + (R"({"name":"s)" + std::to_string(number)) +
                R"(","when":["ENTRYSRC = 'x'"],"stopped":true})";
    }
    directory.write("situations.json", text + "]}");
    begin();
    set->apply({situation("filed")});
    const SituationSet::Change change = set->add(situation("a"));
    EXPECT_EQ(refused(change), SituationRefusal::TOO_MANY);
    EXPECT_EQ(change.error().problem.what,
              "there are 1000 situations created through the API: remove one first");
    EXPECT_TRUE(set->remove("s0"));
    EXPECT_TRUE(set->add(situation("a")));
}

TEST_F(SituationChanges, WhatRunsIsWhatIsSavedHoweverReloadsAndChangesInterleave) {
    const std::vector<SituationConfig> both = {situation("a", {"ENTRYSRC = 'never'"}),
                                               situation("b", {"ENTRYSRC = 'never'"})};
    set->apply(both);
    std::vector<std::thread> threads;
    threads.emplace_back([&] {
        for (int round = 0; round < 30; ++round) {
            set->apply(round % 3 == 0 ? std::vector{both[0]} : both);
        }
    });
    for (const char* const name : {"a", "b"}) {
        threads.emplace_back([&, name] {
            for (int round = 0; round < 30; ++round) {
                set->stop(name); // or the file does not have it
                if (round % 2 == 0) {
                    set->start(name);
                }
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    set->apply(both);
    const auto states = [&] {
        std::vector<std::pair<std::string, SituationStatus::State>> found;
        for (const SituationStatus& status : set->list()) {
            found.emplace_back(status.config.name, status.state);
        }
        return found;
    };
    const auto inForce = states();
    begin();
    set->apply(both);
    EXPECT_EQ(states(), inForce);
    EXPECT_EQ(inForce.size(), 2u);
}

TEST_F(SituationChanges, MayComeFromManyThreadsWhileEntriesArrive) {
    set->apply({situation("filed", {"ENTRYSRC = 'never'"})});
    std::atomic<bool> isOver{false};
    std::thread log([&] {
        zrm_rmlogent_data_t row;
        std::memset(&row, ' ', sizeof row);
        while (!isOver) {
            entries.AddDataToEvent(&row, 1);
        }
    });
    std::thread looker([&] {
        while (!isOver) {
            for (const SituationStatus& status : set->list()) {
                EXPECT_GE(status.offered, status.matched);
                EXPECT_GE(status.matched, status.raised);
            }
        }
    });
    std::thread reloader([&] {
        for (int round = 0; round < 30; ++round) {
            set->apply({situation("filed", {"ENTRYSRC = 'never'"}, round % 2 ? "info" : "minor")});
        }
    });
    std::vector<std::thread> changers;
    for (int number = 0; number < 4; ++number) {
        changers.emplace_back([&, name = "s" + std::to_string(number)] {
            for (int round = 0; round < 10; ++round) {
                const SituationConfig config = situation(name, {"ENTRYSRC = 'never'"});
                EXPECT_TRUE(set->add(config));
                EXPECT_EQ(done(set->stop(name)).state, SituationStatus::STOPPED);
                EXPECT_EQ(done(set->start(name)).state, SituationStatus::RUNNING);
                EXPECT_TRUE(set->remove(name));
            }
        });
    }
    for (std::thread& changer : changers) {
        changer.join();
    }
    reloader.join();
    isOver = true;
    log.join();
    looker.join();
    EXPECT_THAT(names(), ElementsAre("filed"));
}

} // namespace
