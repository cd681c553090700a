#include "host/history/RateTable.h"

#include "host/history/Schema.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Optional;

constexpr std::int64_t minute = 60'000; ///< milliseconds
constexpr std::int64_t start = 29'920'626;

class RateTableTest : public testing::Test {
protected:
    RateTableTest() {
        Schema::bringUpToDate(database);
        database.run("INSERT INTO logs VALUES (1, '/b'), (2, '/a')");
        table = std::make_unique<RateTable>(database);
    }
    Rates read(std::int64_t from, std::int64_t to, std::int64_t step = 1) {
        return RateTable::read(database, from * minute, to * minute, step * minute);
    }

    TemporaryDirectory directory;
    Database database{directory.file("history.db"), Database::Use::WRITE};
    std::unique_ptr<RateTable> table;
};

TEST_F(RateTableTest, HasNoValueForMinutesThatWereNotWatched) {
    EXPECT_THAT(read(start, start + 3).logs, IsEmpty());
    table->watched(start);
    table->watched(start + 2);
    table->add(start + 2, 1, 10, 0);
    table->add(start + 2, 1, 5, 1);
    const Rates rates = read(start - 1, start + 4);
    EXPECT_EQ(rates.start, (start - 1) * minute);
    EXPECT_EQ(rates.step, minute);
    ASSERT_EQ(rates.logs.size(), 1u);
    EXPECT_EQ(rates.logs[0].log, "/b");
    EXPECT_THAT(rates.logs[0].entries,
                ElementsAre(std::nullopt, Optional(0u), std::nullopt, Optional(15u), std::nullopt));
    EXPECT_THAT(rates.logs[0].events,
                ElementsAre(std::nullopt, Optional(0u), std::nullopt, Optional(1u), std::nullopt));
}

TEST_F(RateTableTest, AddsUpTheMinutesOfAStep) {
    for (std::int64_t at = start; at < start + 10; ++at) {
        table->watched(at);
        table->add(at, 1, 1, 0);
        table->add(at, 2, 0, 2);
    }
    const std::int64_t aligned = start / 5 * 5;
    const Rates rates = read(aligned, aligned + 15, 5);
    EXPECT_EQ(rates.step, 5 * minute);
    ASSERT_EQ(rates.logs.size(), 2u);
    EXPECT_EQ(rates.logs[0].log, "/a") << "by path";
    const auto inFirst = static_cast<std::uint64_t>(aligned + 5 - start);
    EXPECT_THAT(rates.logs[1].entries,
                ElementsAre(Optional(inFirst), Optional(5u), Optional(5 - inFirst)));
    EXPECT_THAT(rates.logs[0].events,
                ElementsAre(Optional(2 * inFirst), Optional(10u), Optional(2 * (5 - inFirst))));
}

TEST_F(RateTableTest, AWindowConsistsOfWholeSteps) {
    table->add(start, 1, 1, 0);
    const Rates rates =
        RateTable::read(database, start * minute + 59'999, start * minute + 60'001, minute);
    EXPECT_EQ(rates.start, start * minute);
    ASSERT_EQ(rates.logs.size(), 1u);
    EXPECT_THAT(rates.logs[0].entries, ElementsAre(Optional(1u), std::nullopt));
    EXPECT_THAT(read(start, start).logs, IsEmpty());
    EXPECT_THAT(read(start, start - 5).logs, IsEmpty());
}

TEST_F(RateTableTest, DropsWhatIsMoreThanADayAway) {
    for (const std::int64_t at : {start, start + 1, start + 1440, start + 9000}) {
        table->add(at, 1, 1, 0);
        database.run("INSERT INTO minutes VALUES (" + std::to_string(at) + ")");
    }
    table->watched(start + 1441);
    EXPECT_EQ(database.number("SELECT group_concat(minute) = '" + std::to_string(start + 1) + "," +
                              std::to_string(start + 1440) + "' FROM rates"),
              1);
    EXPECT_EQ(database.number("SELECT count(*) FROM minutes"), 3);
}

} // namespace
