#include "host/history/HistoryQuery.h"

#include "TestBatch.h"
#include "host/history/HistoryFile.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <iostream>
#include <random>
#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class HistoryQueryTest : public testing::Test {
protected:
    std::vector<std::uint64_t> ids(const EventFilter& filter) {
        std::vector<std::uint64_t> ids;
        for (const StoredEvent& event : HistoryQuery(database, filter).run().events) {
            ids.push_back(event.id);
        }
        return ids;
    }

    TemporaryDirectory directory;
    HistoryFile file{directory.file("history.db")};
    Database database{directory.file("history.db"), Database::Use::READ};
};

TEST_F(HistoryQueryTest, ReturnsCompleteEvents) {
    EventRecord event = testEvent(1, testTime, "ssh", "/var/log/auth.log", "critical");
    event.json = R"({"id":1})";
    file.store(*batchOf({event, testEvent(2)}), {});
    EXPECT_THAT(HistoryQuery(database, {.situations = {"ssh"}}).run().events,
                ElementsAre(StoredEvent{1, testTime, "ssh", "critical", "/var/log/auth.log",
                                        R"({"id":1})"}));
}

TEST_F(HistoryQueryTest, APageOfLargeEventsEndsEarlyAndSaysWhere) {
    const std::string json = "\"" + std::string(1024 * 1024, 'x') + "\"";
    std::vector<EventRecord> events;
    for (std::uint64_t id = 1; id <= 20; ++id) {
        events.push_back(testEvent(id));
        events.back().json = json;
    }
    file.store(*batchOf(events), {});
    EventFilter filter{.newestFirst = false};
    std::vector<std::uint64_t> ids;
    int pages = 0;
    for (bool isMore = true; isMore; ++pages) {
        const EventPage page = HistoryQuery(database, filter).run();
        EXPECT_LE(page.events.size(), 9u);
        for (const StoredEvent& event : page.events) {
            ids.push_back(event.id);
        }
        isMore = page.reached.has_value();
        filter.after = page.reached.value_or(0);
    }
    EXPECT_EQ(ids.size(), 20u);
    EXPECT_EQ(ids.back(), 20u);
    EXPECT_EQ(pages, 3);
}

TEST_F(HistoryQueryTest, ReturnsTheNewestFirstByDefault) {
    file.store(*batchOf(1, 500), {});
    EXPECT_EQ(ids({}).size(), 100u);
    EXPECT_THAT(ids({.limit = 3}), ElementsAre(500, 499, 498));
    EXPECT_THAT(ids({.limit = 3, .newestFirst = false}), ElementsAre(1, 2, 3));
    EXPECT_THAT(ids({.after = 498}), ElementsAre(500, 499));
    EXPECT_THAT(ids({.after = 10, .before = 13, .newestFirst = false}), ElementsAre(11, 12));
    EXPECT_THAT(ids({.limit = 0}), IsEmpty());
    EXPECT_THAT(ids({.after = UINT64_MAX}), IsEmpty());
    EXPECT_THAT(ids({.before = 0}), IsEmpty());
    EXPECT_THAT(ids({.after = 499, .before = UINT64_MAX}), ElementsAre(500));
}

TEST_F(HistoryQueryTest, AnEmptyHistoryHasNoEvents) {
    EXPECT_THAT(ids({}), IsEmpty());
    EXPECT_THAT(ids({.from = 0, .to = testTime}), IsEmpty());
    EXPECT_THAT(ids({.situations = {"a"}}), IsEmpty());
}

TEST_F(HistoryQueryTest, TakesTextsLiterally) {
    const std::string odd = "x' OR 1=1; DROP TABLE events; -- \" \\ % _ \xc3\xa4";
    file.store(*batchOf({testEvent(1, testTime, odd, odd, odd), testEvent(2)}), {});
    EXPECT_THAT(ids({.situations = {odd}, .logs = {odd}, .severities = {odd}}), ElementsAre(1));
    EXPECT_THAT(ids({.situations = {"%"}}), IsEmpty());
    EXPECT_THAT(ids({.situations = {"WATCH"}}), IsEmpty());
    EXPECT_THAT(ids({.logs = {std::string("/var/log/app.log\0", 17)}}), IsEmpty());
}

/// An event whose row has this description.
EventRecord described(std::uint64_t id, std::string& room, const std::string& description,
                      std::string_view situation = "watch") {
    room = R"({"row":{"UENTRYDESC":")" + description + R"("}})";
    EventRecord event = testEvent(id, testTime, situation);
    event.json = room;
    return event;
}

TEST_F(HistoryQueryTest, FindsATextInTheWholeHistory) {
    std::vector<std::string> rooms(1000);
    std::vector<EventRecord> events;
    for (std::uint64_t id = 1; id <= rooms.size(); ++id) {
        events.push_back(described(id, rooms[id - 1], id % 100 == 7 ? "Disk FULL" : "all is well",
                                   id == 207 ? "rare" : "often"));
    }
    file.store(*batchOf(events), {});
    EXPECT_THAT(ids({.text = "disk full", .limit = 3}), ElementsAre(907, 807, 707));
    EXPECT_THAT(ids({.before = 207, .text = "disk full"}), ElementsAre(107, 7));
    EXPECT_THAT(ids({.situations = {"rare"}, .text = "disk"}), ElementsAre(207));
    EXPECT_THAT(
        ids({.situations = {"often", "rare"}, .text = "disk", .limit = 1, .newestFirst = false}),
        ElementsAre(7));
    EXPECT_THAT(ids({.text = "nowhere"}), IsEmpty());
}

TEST_F(HistoryQueryTest, ASearchThatRunsOutOfTimeSaysHowFarItGot) {
    std::vector<std::string> rooms(1000);
    std::vector<EventRecord> events;
    for (std::uint64_t id = 1; id <= rooms.size(); ++id) {
        events.push_back(described(id, rooms[id - 1], id == 1 ? "the one" : "another"));
    }
    file.store(*batchOf(events), {});
    for (const std::vector<std::string>& situations :
         {std::vector<std::string>{}, std::vector<std::string>{"watch"}}) {
        EventFilter filter{.situations = situations, .text = "the one"};
        std::vector<std::uint64_t> found;
        int requests = 0;
        for (bool isMore = true; isMore; ++requests) {
            const EventPage page = HistoryQuery(database, filter, std::chrono::seconds(0)).run();
            for (const StoredEvent& event : page.events) {
                found.push_back(event.id);
            }
            isMore = page.reached.has_value();
            ASSERT_TRUE(!isMore || *page.reached < filter.before.value_or(1001));
            filter.before = page.reached;
        }
        EXPECT_THAT(found, ElementsAre(1));
        EXPECT_EQ(requests, 1000 / 64 + 1);
    }
    EXPECT_FALSE(HistoryQuery(database, {.limit = 1000}, std::chrono::seconds(0)).run().reached)
        << "only a search for a text is limited in time";
}

TEST_F(HistoryQueryTest, ADamagedEventIsReportedAndNotReturned) {
    std::vector<std::string> rooms(9);
    std::vector<EventRecord> events;
    for (std::uint64_t id = 1; id <= rooms.size(); ++id) {
        events.push_back(described(id, rooms[id - 1], "text"));
    }
    file.store(*batchOf(events), {});
    Database writer(directory.file("history.db"), Database::Use::WRITE);
    writer.run("UPDATE events SET json = replace(json, 'text', 'tExt') WHERE id = 2");
    writer.run("UPDATE events SET raised = raised + 1 WHERE id = 4");
    writer.run("UPDATE events SET label = 99 WHERE id = 6");
    writer.run("UPDATE events SET json = '{\"row', checksum = NULL WHERE id = 7");
    writer.run(
        "UPDATE events SET checksum = NULL WHERE id = 8"); // as written by an earlier version
    const EventPage page = HistoryQuery(database, {.newestFirst = false}).run();
    EXPECT_THAT(page.damaged, ElementsAre(2, 4, 6, 7));
    EXPECT_THAT(ids({.newestFirst = false}), ElementsAre(1, 3, 5, 8, 9));
    EXPECT_THAT(HistoryQuery(database, {.text = "text", .newestFirst = false}).run().damaged,
                ElementsAre(2, 4, 6));
}

TEST_F(HistoryQueryTest, ARareSituationIsFoundWithoutScanningTheOthers) {
    std::vector<EventRecord> events;
    for (std::uint64_t id = 1; id <= 200'000; ++id) {
        events.push_back(testEvent(id, testTime, id == 77 ? "rare" : "often"));
    }
    file.store(*batchOf(events), {});
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_THAT(ids({.situations = {"rare"}}), ElementsAre(77));
    EXPECT_LT(std::chrono::steady_clock::now() - begin, std::chrono::milliseconds(20));
}

/// What a plain scan of all events finds.
std::vector<std::uint64_t> expected(const std::vector<EventRecord>& events,
                                    const EventFilter& filter) {
    const auto isOneOf = [](std::string_view text, const std::vector<std::string>& texts) {
        return texts.empty() || std::find(texts.begin(), texts.end(), text) != texts.end();
    };
    std::vector<std::uint64_t> ids;
    for (const EventRecord& event : events) {
        if (event.id > filter.after && event.id < filter.before.value_or(UINT64_MAX) &&
            event.raised >= filter.from.value_or(INT64_MIN) &&
            event.raised <= filter.to.value_or(INT64_MAX) &&
            isOneOf(event.situation, filter.situations) && isOneOf(event.log, filter.logs) &&
            isOneOf(event.severity, filter.severities)) {
            ids.push_back(event.id);
        }
    }
    if (filter.newestFirst) {
        std::reverse(ids.begin(), ids.end());
    }
    ids.resize(std::min(ids.size(), filter.limit));
    return ids;
}

TEST_F(HistoryQueryTest, AgreesWithAPlainScanWhateverTheFilterAndTheClock) {
    const unsigned seed = std::random_device{}();
    std::cout << "seed " << seed << std::endl;
    std::mt19937 random(seed);
    const auto upTo = [&](std::uint64_t most) {
        return std::uniform_int_distribution<std::uint64_t>(0, most)(random);
    };
    const std::vector<std::string> names = {"a", "b", "c", "d"};
    std::vector<EventRecord> events;
    std::int64_t raised = testTime;
    const std::uint64_t first = 1 + upTo(3000);
    for (std::uint64_t id = first; id < first + 6000; ++id) {
        // Occasionally the clock is set, mostly back.
        raised += upTo(999) == 0 ? static_cast<std::int64_t>(upTo(900'000)) - 600'000
                                 : static_cast<std::int64_t>(upTo(100));
        events.push_back(testEvent(id, raised, names[upTo(3)], names[upTo(2)],
                                   upTo(50) == 0 ? "major" : "info"));
    }
    file.continueAfter(first - 1);
    for (std::size_t at = 0; at < events.size();) {
        const std::size_t count = std::min<std::size_t>(1 + upTo(511), events.size() - at);
        file.store(*batchOf({events.begin() + static_cast<std::ptrdiff_t>(at),
                             events.begin() + static_cast<std::ptrdiff_t>(at + count)}),
                   {});
        at += count;
    }
    const auto some = [&](std::vector<std::string> from) {
        std::shuffle(from.begin(), from.end(), random);
        from.resize(upTo(1) == 0 ? 0 : 1 + upTo(2));
        return from;
    };
    for (int number = 0; number < 300; ++number) {
        EventFilter filter;
        filter.after = upTo(2) == 0 ? first + upTo(6000) : 0;
        filter.before = upTo(2) == 0 ? std::optional(first + upTo(6000)) : std::nullopt;
        const auto time = [&] { return events[upTo(5999)].raised; };
        filter.from = upTo(2) == 0 ? std::optional(time()) : std::nullopt;
        filter.to = upTo(2) == 0 ? std::optional(time()) : std::nullopt;
        filter.situations = some(names);
        filter.logs = some(names);
        filter.severities = some({"major", "info", "critical"});
        filter.limit = upTo(1) == 0 ? 10 : 1'000'000;
        filter.newestFirst = upTo(1) == 0;
        ASSERT_EQ(ids(filter), expected(events, filter)) << "query " << number;
    }
}

} // namespace
