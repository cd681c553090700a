#include "host/history/EpisodeTable.h"

#include "host/history/EpisodeReader.h"
#include "host/history/HistoryFile.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class EpisodeTableTest : public testing::Test {
protected:
    static constexpr std::int64_t noon = 1'800'000'000;

    static EpisodeChange change(std::uint64_t event, EventJudgement::State state,
                                std::uint64_t episode, const std::string& ip = "10.0.0.1") {
        auto judgement = std::make_shared<EventJudgement>();
        judgement->state = state;
        if (episode > 0) {
            judgement->episode = std::make_shared<EpisodeId>(episode);
        }
        judgement->count = 5;
        judgement->first = noon;
        judgement->last = noon + 4;
        judgement->group = {{"ip", ip}};
        SituationLabel label{"ssh", "major"};
        label.definition = -17;
        return {event,
                (noon + 5) * 1000,
                "/log",
                "web1:ZRM",
                std::make_shared<const SituationLabel>(std::move(label)),
                judgement};
    }
    static EpisodeShare share(std::uint64_t episode, const std::string& log, std::uint64_t count,
                              std::int64_t last) {
        return {std::make_shared<EpisodeId>(episode), log, count, noon, noon + last};
    }
    std::vector<EpisodeRecord> read(const EpisodeFilter& filter = {}) {
        return EpisodeReader::read(database, filter);
    }
    std::vector<std::uint64_t> ids(const EpisodeFilter& filter) {
        std::vector<std::uint64_t> ids;
        for (const EpisodeRecord& episode : read(filter)) {
            ids.push_back(episode.id);
        }
        return ids;
    }

    TemporaryDirectory directory;
    std::unique_ptr<HistoryFile> file = std::make_unique<HistoryFile>(directory.file("history.db"));
    Database database{directory.file("history.db"), Database::Use::WRITE};
    EpisodeTable table{database};
};

TEST_F(EpisodeTableTest, AnOpenEpisodeIsWhatItsLogsHaveAdded) {
    table.keep(change(7, EventJudgement::RAISED, 7));
    table.keep(share(7, "/log", 5, 4));
    table.keep(share(7, "/other", 2, 60));
    table.keep(share(7, "/log", 9, 30));
    const auto found = read();
    ASSERT_EQ(found.size(), 1u);
    EXPECT_TRUE(found[0].isOpen);
    EXPECT_EQ(found[0].count, 11u);
    EXPECT_EQ(found[0].last, noon + 60);
    EXPECT_EQ(found[0].groups, R"({"ip":"10.0.0.1"})");
    EXPECT_EQ(found[0].resolved, 0);
    const std::vector<StoredEpisode> open = EpisodeTable::open(database);
    ASSERT_EQ(open.size(), 1u);
    EXPECT_EQ(open[0].id, 7u);
    EXPECT_EQ(open[0].definition, -17);
    EXPECT_EQ(open[0].node, "web1:ZRM");
    EXPECT_THAT(open[0].group, ElementsAre(GroupValue{"ip", "10.0.0.1"}));
    ASSERT_EQ(open[0].shares.size(), 2u);
    EXPECT_EQ(open[0].shares[0].count, 9u);
}

TEST_F(EpisodeTableTest, AResolvedOneHasItsEnd) {
    table.keep(change(7, EventJudgement::RAISED, 7));
    table.keep(share(7, "/log", 9, 30));
    table.keep(change(12, EventJudgement::RESOLVED, 7));
    const auto found = read();
    ASSERT_EQ(found.size(), 1u);
    EXPECT_FALSE(found[0].isOpen);
    EXPECT_EQ(found[0].count, 5u) << "as its event says";
    EXPECT_EQ(found[0].resolved, (noon + 5) * 1000);
    EXPECT_EQ(found[0].resolvedBy, 12u);
    EXPECT_THAT(EpisodeTable::open(database), IsEmpty());
}

TEST_F(EpisodeTableTest, AnOpenOneIsAcknowledgedOnceUntilThatIsWithdrawn) {
    using Change = AcknowledgementChange;
    const Acknowledgement ann{1000, "ann", "on it"};
    table.keep(change(7, EventJudgement::RAISED, 7));
    table.keep(change(8, EventJudgement::RAISED, 8, "10.0.0.2"));
    EXPECT_EQ(table.withdraw(7), Change::NOT_TAKEN);
    EXPECT_EQ(table.acknowledge(7, ann), Change::DONE);
    EXPECT_EQ(table.acknowledge(7, {2000, "ben", ""}), Change::TAKEN);
    EXPECT_EQ(read({.ids = {7}}).at(0).acknowledged, ann);
    EXPECT_THAT(ids({.isAcknowledged = true}), ElementsAre(7));
    EXPECT_THAT(ids({.isAcknowledged = false}), ElementsAre(8));
    EXPECT_EQ(EpisodeReader::countAcknowledged(database), 1u);
    EXPECT_EQ(table.withdraw(7), Change::DONE);
    EXPECT_EQ(read({.ids = {7}}).at(0).acknowledged, Acknowledgement());
    EXPECT_EQ(EpisodeReader::countAcknowledged(database), 0u);
}

TEST_F(EpisodeTableTest, AResolvedOneKeepsItsAcknowledgementAndTakesNoOther) {
    using Change = AcknowledgementChange;
    table.keep(change(7, EventJudgement::RAISED, 7));
    ASSERT_EQ(table.acknowledge(7, {1000, "ann", "x'; --"}), Change::DONE);
    table.keep(change(9, EventJudgement::RESOLVED, 7));
    table.keep(change(10, EventJudgement::PAUSED, 0));
    EXPECT_EQ(table.acknowledge(7, {1000, "ben", ""}), Change::RESOLVED);
    EXPECT_EQ(table.withdraw(7), Change::RESOLVED);
    EXPECT_EQ(read().at(0).acknowledged.note, "x'; --");
    EXPECT_EQ(EpisodeReader::countAcknowledged(database), 0u) << "it is not open";
    EXPECT_EQ(table.acknowledge(9, {1000, "ann", ""}), Change::UNKNOWN);
    EXPECT_EQ(table.acknowledge(10, {1000, "ann", ""}), Change::UNKNOWN) << "a pause";
}

TEST_F(EpisodeTableTest, APauseIsKeptOncePerGroupAndIsNoEpisode) {
    table.keep(change(7, EventJudgement::PAUSED, 0));
    table.keep(change(8, EventJudgement::PAUSED, 0, "10.0.0.2"));
    table.keep(change(9, EventJudgement::PAUSED, 0));
    EXPECT_THAT(read(), IsEmpty());
    const std::vector<StoredEpisode> open = EpisodeTable::open(database);
    ASSERT_EQ(open.size(), 2u);
    EXPECT_TRUE(open[0].isPause);
    EXPECT_EQ(open[1].id, 9u);
    EXPECT_EQ(open[1].last, noon + 4);
}

TEST_F(EpisodeTableTest, FiltersSelect) {
    table.keep(change(7, EventJudgement::RAISED, 7));
    table.keep(share(7, "/other", 1, 0));
    table.keep(change(8, EventJudgement::RAISED, 8, "x'; --"));
    table.keep(change(9, EventJudgement::RESOLVED, 8, "x'; --"));
    EXPECT_THAT(ids({}), ElementsAre(8, 7));
    EXPECT_THAT(ids({.before = 8}), ElementsAre(7));
    EXPECT_THAT(ids({.isOpen = true}), ElementsAre(7));
    EXPECT_THAT(ids({.isOpen = false}), ElementsAre(8));
    EXPECT_THAT(ids({.situations = {"ssh", "none"}}), ElementsAre(8, 7));
    EXPECT_THAT(ids({.situations = {"none"}}), IsEmpty());
    EXPECT_THAT(ids({.logs = {"/other"}}), ElementsAre(7));
    EXPECT_THAT(ids({.logs = {"/log"}}), ElementsAre(8, 7));
    EXPECT_THAT(ids({.group = {{"ip", "x'; --"}}}), ElementsAre(8));
    EXPECT_THAT(ids({.group = {{"user", "x'; --"}}}), IsEmpty());
    EXPECT_THAT(ids({.ids = {7}}), ElementsAre(7));
    EXPECT_THAT(ids({.ids = {9, 8, 12}}), ElementsAre(8));
    EXPECT_THAT(ids({.limit = 1}), ElementsAre(8));
}

TEST_F(EpisodeTableTest, WhatHasEndedGoesWithItsEventsAndWhatLastsStays) {
    table.keep(change(7, EventJudgement::RAISED, 7));
    table.keep(share(7, "/log", 1, 0));
    table.keep(change(8, EventJudgement::RAISED, 8));
    table.keep(share(8, "/log", 1, 0));
    table.keep(change(9, EventJudgement::RESOLVED, 8));
    table.keep(change(10, EventJudgement::PAUSED, 0));
    table.removeUntil(10);
    EXPECT_THAT(ids({}), ElementsAre(7));
    EXPECT_EQ(database.number("SELECT count(*) FROM episode_logs"), 1);
    EXPECT_EQ(EpisodeTable::open(database).size(), 1u);
}

} // namespace
