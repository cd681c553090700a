#include "host/framework/Audience.h"

#include "base/LockGuard.h"
#include "host/framework/Request.h"
#include "unit/host/framework/TestTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <deque>
#include <list>
#include <memory>
#include <random>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class AudienceTest : public testing::Test {
protected:
    struct Situation {
        RequestCounts counts;
        std::unique_ptr<Request> request;
    };

    /// Opens a situation; its index in `situations` identifies it.
    Situation& open(std::vector<Condition> conditions) {
        RequestDetail detail;
        detail.name = "test";
        detail.conditions = std::move(conditions);
        Situation& situation = *situations.emplace_back(std::make_unique<Situation>());
        situation.request =
            std::make_unique<Request>(manager, std::move(detail), receiver, &situation.counts);
        return situation;
    }
    void close(std::size_t index) { situations[index]->request.reset(); }

    /// The indices of the situations that the row is offered to.
    std::vector<int> audienceOf(TestRow& row) {
        const LockGuard guard(manager.lock());
        std::vector<int> result;
        LinkedListIter next(manager.requestsFor(row.bytes(), sizeof row));
        while (void* const element = next.Next()) {
            for (std::size_t index = 0; index < situations.size(); ++index) {
                const auto& request = situations[index]->request;
                if (request != nullptr && request->get() == static_cast<ctreq*>(element)) {
                    result.push_back(static_cast<int>(index));
                }
            }
        }
        return result;
    }
    std::vector<int> audienceOf(TestRow&& row) { return audienceOf(row); }

    TestManager manager;
    TestReceiver receiver;
    std::deque<std::unique_ptr<Situation>> situations;
};

Condition onLog(std::string name) {
    return textCondition("LOGNAME", INTF_EQUAL, std::move(name));
}

const TestRow rowBytes("/var/log/", "messages", "Failed password for root", 7);

TEST_F(AudienceTest, WithoutSituationsIsEmpty) {
    EXPECT_THAT(audienceOf(TestRow(rowBytes)), IsEmpty());
}

TEST_F(AudienceTest, HasTheSituationsOfTheLogInOrder) {
    open({onLog("messages")});
    open({onLog("syslog")});
    open({});
    open({textCondition("LOGPATH", INTF_EQUAL, "/var/log/"), onLog("messages")});
    open({textCondition("LOGPATH", INTF_EQUAL, "/var/log"), onLog("messages")});
    EXPECT_THAT(audienceOf(TestRow(rowBytes)), ElementsAre(0, 2, 3));
    EXPECT_THAT(audienceOf(TestRow("/var/log/", "syslog", "", 0)), ElementsAre(1, 2));
    EXPECT_THAT(audienceOf(TestRow("/var/log/", "other", "", 0)), ElementsAre(2));
}

TEST_F(AudienceTest, FollowsARowWhoseLogChangesAtOneAddress) {
    open({onLog("messages")});
    open({onLog("syslog")});
    TestRow row = rowBytes;
    EXPECT_THAT(audienceOf(row), ElementsAre(0));
    std::memcpy(row.logname, "syslog      ", sizeof row.logname);
    EXPECT_THAT(audienceOf(row), ElementsAre(1));
    std::memcpy(row.logname, "messages    ", sizeof row.logname);
    EXPECT_THAT(audienceOf(row), ElementsAre(0));
    row.logname[8] = 'X';
    EXPECT_THAT(audienceOf(row), IsEmpty());
}

TEST_F(AudienceTest, FollowsTheListOfSituations) {
    TestRow row = rowBytes;
    open({onLog("messages")});
    EXPECT_THAT(audienceOf(row), ElementsAre(0));
    open({onLog("messages")});
    EXPECT_THAT(audienceOf(row), ElementsAre(0, 1));
    close(0);
    EXPECT_THAT(audienceOf(row), ElementsAre(1));
    // The new request may have the address of the old one.
    open({onLog("syslog")});
    EXPECT_THAT(audienceOf(row), ElementsAre(1));
    close(1);
    close(2);
    EXPECT_THAT(audienceOf(row), IsEmpty());
}

TEST_F(AudienceTest, IgnoresLogColumnsWithoutConditions) {
    // Otherwise each path would count as a log of its own here and be learned again.
    open({onLog("messages")});
    for (int number = 0; number < 20'000; ++number) {
        const std::string path = "/" + std::to_string(number);
        ASSERT_THAT(audienceOf(TestRow(path, "messages", "", 0)), ElementsAre(0));
    }
}

TEST_F(AudienceTest, HandlesAnyNumberOfLogs) {
    open({textCondition("LOGNAME", INTF_STARTS, "app1")});
    open({textCondition("LOGNAME", INTF_MATCHES, "9$")});
    for (int number = 0; number < 20'000; ++number) {
        const std::string name = "app" + std::to_string(number);
        std::vector<int> expected;
        if (name[3] == '1') {
            expected.push_back(0);
        }
        if (name.back() == '9') {
            expected.push_back(1);
        }
        ASSERT_EQ(audienceOf(TestRow("/", name, "", 0)), expected) << name;
    }
}

TEST_F(AudienceTest, SkipsSituationsThatTheTextRefuses) {
    open({textCondition("TEXT", INTF_STARTS, "Failed")});
    open({textCondition("TEXT", INTF_STARTS, "Accepted")});
    open({textCondition("TEXT", INTF_STARTS, "Failed password for")});
    open({textCondition("TEXT", INTF_STARTS, "Failed password of")});
    open({textCondition("TEXT", INTF_CONTAINS, "password")});
    open({textCondition("TEXT", INTF_CONTAINS, "root ")}); // that would be padding
    open({textCondition("TEXT", INTF_EQUAL, "Failed password for root")});
    open({textCondition("TEXT", INTF_EQUAL, "Failed")});
    open({textCondition("TEXT", INTF_EQUAL, "")});
    open({listCondition("TEXT", {"one", "Failed password for root"})});
    open({listCondition("TEXT", {"one", "two"})});
    open({textCondition("TEXT", INTF_LESS, "G")});
    open({textCondition("TEXT", INTF_GREATER, "G")});
    open({textCondition("TEXT", INTF_STARTS, "Failed"),
          textCondition("TEXT", INTF_CONTAINS, "secret")});
    EXPECT_THAT(audienceOf(TestRow(rowBytes)), ElementsAre(0, 2, 4, 6, 9, 11));
    EXPECT_THAT(audienceOf(TestRow("/", "a", "", 0)), ElementsAre(8, 11));
}

TEST_F(AudienceTest, LeavesNumbersAndUnknownColumnsToTheTable) {
    open({numberCondition("NUMBER", INTF_EQUAL, 99)});
    open({textCondition("UNKNOWN", INTF_EQUAL, "x")});
    EXPECT_THAT(audienceOf(TestRow(rowBytes)), ElementsAre(0, 1));
}

TEST_F(AudienceTest, SkipsASituationWithANonsensicalCondition) {
    open({textCondition("NUMBER", INTF_EQUAL, "seven")});
    open({textCondition("TEXT", static_cast<_IntfOper>(77), "x")});
    EXPECT_THAT(audienceOf(TestRow(rowBytes)), IsEmpty());
    // It is not on a column that names a log, so such a row does not count as a new log's.
    for (int number = 0; number < 20'000; ++number) {
        ASSERT_THAT(audienceOf(TestRow("/", "a", std::to_string(number), number)), IsEmpty());
    }
}

TEST_F(AudienceTest, CountsSkippedRowsAsJudged) {
    Situation& mine = open({onLog("messages")});
    Situation& other = open({onLog("syslog"), textCondition("TEXT", INTF_CONTAINS, "x")});
    const auto offer = [&](TestRow row) {
        const LockGuard guard(manager.lock());
        LinkedListIter next(manager.requestsFor(row.bytes(), sizeof row));
        while (void* const element = next.Next()) {
            static_cast<ctreq*>(element)->CheckForException(row.bytes());
        }
    };
    for (int count = 0; count < 3; ++count) {
        offer(rowBytes);
    }
    Situation& late = open({onLog("syslog")});
    offer(TestRow("/var/log/", "syslog", "axb", 1));
    offer(TestRow("/var/log/", "syslog", "ab", 1));
    EXPECT_EQ(mine.counts.judged(), 5U);
    EXPECT_EQ(mine.counts.matched(), 3U);
    EXPECT_EQ(other.counts.judged(), 5U);
    EXPECT_EQ(other.counts.matched(), 1U);
    EXPECT_EQ(late.counts.judged(), 2U);
    EXPECT_EQ(late.counts.matched(), 2U);
    // A closed situation keeps its counts and counts nothing more.
    mine.request.reset();
    offer(rowBytes);
    EXPECT_EQ(mine.counts.judged(), 5U);
    EXPECT_EQ(other.counts.judged(), 6U);
    // It continues with them when it is opened again.
    mine.request = std::make_unique<Request>(manager, RequestDetail(), receiver, &mine.counts);
    offer(rowBytes);
    EXPECT_EQ(mine.counts.judged(), 6U);
}

std::string randomText(std::mt19937& random, std::size_t most) {
    static const char letters[] = "aab b\tB";
    std::string text(random() % (most + 1), ' ');
    for (char& letter : text) {
        letter = random() % 40 == 0 ? '\0' : letters[random() % (sizeof letters - 1)];
    }
    return text;
}

Condition randomCondition(std::mt19937& random) {
    static const char* const columns[] = {"LOGPATH", "LOGNAME", "TEXT", "TEXT"};
    static const _IntfOper operators[] = {INTF_EQUAL,    INTF_EQUAL,  INTF_NOT_EQUAL, INTF_LESS,
                                          INTF_CONTAINS, INTF_STARTS, INTF_STARTS,    INTF_MATCHES};
    const std::string column = columns[random() % std::size(columns)];
    if (random() % 6 == 0) {
        return numberCondition("NUMBER", INTF_LESS, static_cast<int>(random() % 4));
    }
    if (random() % 6 == 0) {
        return listCondition(column, {randomText(random, 2), randomText(random, 12)});
    }
    const _IntfOper op = operators[random() % std::size(operators)];
    return textCondition(column, op, op == INTF_MATCHES ? "a.*b" : randomText(random, 12));
}

// A situation that is left out would have refused the row, and none is left out because of a
// number.
TEST_F(AudienceTest, NeverLeavesOutASituationThatWouldTakeTheRow) {
    const char* const given = std::getenv("ZRM_TEST_SEED");
    const unsigned seed =
        given != nullptr ? static_cast<unsigned>(std::atol(given)) : std::random_device{}();
    SCOPED_TRACE("ZRM_TEST_SEED=" + std::to_string(seed));
    std::mt19937 random(seed);
    int taken = 0;
    int leftOut = 0;
    for (int round = 0; round < 300; ++round) {
        if (situations.size() > 30) {
            situations.clear();
        }
        if (!situations.empty() && random() % 3 == 0) {
            close(random() % situations.size());
        }
        std::vector<Condition> conditions(random() % 4);
        std::generate(conditions.begin(), conditions.end(),
                      [&random] { return randomCondition(random); });
        open(std::move(conditions));
        for (int sample = 0; sample < 60; ++sample) {
            TestRow row(randomText(random, 3), randomText(random, 2), randomText(random, 14),
                        static_cast<int>(random() % 4));
            const std::vector<int> audience = audienceOf(row);
            ASSERT_TRUE(std::is_sorted(audience.begin(), audience.end()));
            for (std::size_t index = 0; index < situations.size(); ++index) {
                const auto& request = situations[index]->request;
                if (request == nullptr) {
                    continue;
                }
                const bool isOffered =
                    std::find(audience.begin(), audience.end(), index) != audience.end();
                const bool takes = request->get()->CheckForException(row.bytes()) != 0;
                ASSERT_TRUE(isOffered || !takes) << "round " << round << ", situation " << index;
                taken += takes ? 1 : 0;
                leftOut += isOffered ? 0 : 1;
            }
        }
    }
    EXPECT_GT(taken, 1000);
    EXPECT_GT(leftOut, 1000);
}

} // namespace
