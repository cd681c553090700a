#include "host/framework/Request.h"

#include "base/LockGuard.h"
#include "framework/values.h"
#include "host/framework/RequestState.h"
#include "host/framework/Sample.h"
#include "host/framework/Tables.h"
#include "unit/host/framework/TestTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <thread>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

RequestDetail detailOf(SampleType type, std::vector<Condition> conditions = {}) {
    RequestDetail detail;
    detail.name = "test";
    detail.sampleType = type;
    detail.conditions = std::move(conditions);
    return detail;
}

/// True when another thread could take the table manager's lock.
bool isUnlocked(TableManager& manager) {
    bool free = false;
    std::thread([&] {
        free = pthread_mutex_trylock(&manager.lock()->mutex) == 0;
        if (free) {
            SYS1_ReleaseLock(manager.lock());
        }
    }).join();
    return free;
}

TEST(Request, LinksASituationWhileItIsOpen) {
    TestManager manager;
    TestReceiver receiver;
    {
        const Request first(manager, detailOf(SAMPLE_SITUATION), receiver);
        const Request second(manager, detailOf(SAMPLE_SITUATION), receiver);
        ASSERT_TRUE(first.isOpen());
        EXPECT_THAT(manager.linked(), ElementsAre(first.get(), second.get()));
        EXPECT_STREQ(first.get()->name(), "test");
        EXPECT_EQ(first.get()->manager(), &manager);
        EXPECT_NE(first.get()->identifier(), second.get()->identifier());
    }
    EXPECT_THAT(manager.linked(), IsEmpty());
}

TEST(Request, NeverLinksAReport) {
    TestManager manager;
    TestReceiver receiver;
    const Request report(manager, detailOf(SAMPLE_REPORT), receiver);
    EXPECT_TRUE(report.isOpen());
    EXPECT_THAT(manager.linked(), IsEmpty());
}

TEST(Request, CountsWhatItJudgesAndWhatMatches) {
    TestManager manager;
    TestReceiver receiver;
    RequestCounts counts;
    const auto judge = [&](Request& request, int number) {
        TestRow row("", "", "", number);
        request.get()->CheckForException(row.bytes());
    };
    {
        Request request(manager,
                        detailOf(SAMPLE_SITUATION, {numberCondition("NUMBER", INTF_GREATER, 5)}),
                        receiver, &counts);
        for (int number = 0; number < 10; ++number) {
            judge(request, number);
        }
        EXPECT_EQ(counts.judged(), 10u);
        EXPECT_EQ(counts.matched(), 4u);
        EXPECT_EQ(request.get()->framework().counts.judged(), 10u);
        request.get()->Stop();
        judge(request, 9);
        EXPECT_EQ(counts.judged(), 10u) << "a stopped request judges nothing";
    }
    Request again(manager, detailOf(SAMPLE_SITUATION), receiver, &counts);
    judge(again, 1);
    EXPECT_EQ(counts.judged(), 11u) << "the counts outlive the request";
    Request other(manager, detailOf(SAMPLE_SITUATION), receiver);
    EXPECT_EQ(other.get()->framework().counts.judged(), 0u);
}

TEST(Request, IsNotOpenWhenTheTableRefuses) {
    TestManager manager;
    manager.gives = false;
    TestReceiver receiver;
    const Request request(manager, detailOf(SAMPLE_SITUATION), receiver);
    EXPECT_FALSE(request.isOpen());
    EXPECT_EQ(request.get(), nullptr);
    EXPECT_THAT(manager.linked(), IsEmpty());
}

TEST(Request, HoldsNoLockWhileTheTableWorks) {
    TestManager manager;
    TestReceiver receiver;
    int checked = 0;
    manager.onCreate = [&](TestRequest& request) {
        EXPECT_TRUE(isUnlocked(manager)) << "creation";
        request.onSample = [&](TestRequest&) {
            EXPECT_TRUE(isUnlocked(manager)) << "sample";
            ++checked;
        };
        request.onDestruction = [&] {
            EXPECT_TRUE(isUnlocked(manager)) << "destruction";
            EXPECT_THAT(manager.linked(), IsEmpty()) << "unlinked before";
            ++checked;
        };
        ++checked;
    };
    { const Request situation(manager, detailOf(SAMPLE_SITUATION), receiver); }
    EXPECT_EQ(checked, 2);
    {
        const Request report(manager, detailOf(SAMPLE_REPORT), receiver);
        report.get()->TakeSample();
    }
    EXPECT_EQ(checked, 5);
}

TEST(Request, IsDestroyedWhenTheLastPinIsDropped) {
    TestManager manager;
    TestReceiver receiver;
    std::atomic<bool> destroyed{false};
    manager.onCreate = [&](TestRequest& request) {
        request.onDestruction = [&] { destroyed = true; };
    };
    auto request = std::make_unique<Request>(manager, detailOf(SAMPLE_SITUATION), receiver);
    const unsigned handle = request->get()->handle();
    ASSERT_EQ(ctreq::UseHandle(handle), request->get());
    std::thread closer([&] { request.reset(); });
    while (ctreq* const pinned = ctreq::UseHandle(handle)) {
        EXPECT_EQ(pinned->handle(), handle);
        RSC1_Drop(handle);
        std::this_thread::yield();
    }
    EXPECT_FALSE(destroyed);
    RSC1_Drop(handle);
    closer.join();
    EXPECT_TRUE(destroyed);
}

// What a log's thread does with each row, on two threads while situations come and go.
TEST(Request, SituationsComeAndGoDuringFanOut) {
    TestManager manager;
    TestReceiver receiver;
    std::atomic<bool> done{false};
    std::atomic<int> offered{0};
    const auto fanOut = [&] {
        TestRow row("/var/log/", "messages", "hello", 7);
        while (!done) {
            const LockGuard guard(manager.lock());
            LinkedListIter walk(manager.requests());
            while (auto* const request = static_cast<ctreq*>(walk.Next())) {
                ctreq::UseHandle(request->handle());
                if (request->CheckForException(row.bytes()) != 0) {
                    request->InsertRow(row.bytes());
                }
                request->Dispatch();
                request->count = 0;
                RSC1_Drop(request->handle());
                ++offered;
            }
        }
    };
    std::thread first(fanOut);
    std::thread second(fanOut);
    const std::vector<Condition> conditions{textCondition("LOGNAME", INTF_EQUAL, "messages")};
    for (int round = 0; round < 200 || offered < 100; ++round) {
        const Request one(manager, detailOf(SAMPLE_SITUATION, conditions), receiver);
        const Request two(manager, detailOf(SAMPLE_SITUATION), receiver);
        std::this_thread::yield();
    }
    done = true;
    first.join();
    second.join();
    EXPECT_EQ(receiver.dispatches, offered.load());
}

TEST(Tables, FindsRegisteredTables) {
    EXPECT_EQ(Tables::find("ONE"), nullptr);
    {
        TestManager one("ONE");
        TestManager two("TWO");
        TestManager oneAgain("ONE");
        EXPECT_EQ(TableManager::RegisterWithManager(&one), 0u);
        EXPECT_EQ(TableManager::RegisterWithManager(&two), 0u);
        EXPECT_EQ(Tables::find("ONE"), &one);
        EXPECT_EQ(Tables::find("TWO"), &two);
        EXPECT_EQ(Tables::find("TW"), nullptr);
        EXPECT_NE(TableManager::RegisterWithManager(&oneAgain), 0u) << "the name is taken";
        EXPECT_NE(TableManager::RegisterWithManager(nullptr), 0u);
        Tables::clear();
        EXPECT_EQ(Tables::find("ONE"), nullptr);
        EXPECT_EQ(TableManager::RegisterWithManager(&one), 0u);
    }
    EXPECT_EQ(Tables::find("ONE"), nullptr) << "a destroyed manager is removed";
}

TEST(Tables, HasRoomForSixteen) {
    std::vector<std::string> names(17);
    std::vector<std::unique_ptr<TestManager>> managers;
    for (std::size_t index = 0; index < names.size(); ++index) {
        names[index] = "T" + std::to_string(index);
        managers.push_back(std::make_unique<TestManager>(names[index].c_str()));
        EXPECT_EQ(TableManager::RegisterWithManager(managers.back().get()) == 0, index < 16);
    }
}

class SampleTest : public testing::Test {
protected:
    SampleTest() {
        TableManager::RegisterWithManager(&manager);
        manager.onCreate = [](TestRequest& request) {
            request.onSample = [](TestRequest& sampled) {
                sampled.count = 0;
                for (int number = 0; number < 10; ++number) {
                    TestRow row("/var/log/", "messages", "text", number);
                    if (sampled.CheckForException(row.bytes()) != 0) {
                        EXPECT_EQ(sampled.InsertRow(row.bytes()), 0u);
                    }
                }
            };
        };
    }
    TestManager manager;
};

TEST_F(SampleTest, ReturnsTheRowsThatMeetTheConditions) {
    const auto sample = Sample::take("TESTTABLE", {numberCondition("NUMBER", INTF_GREATER, 6)});
    ASSERT_TRUE(sample);
    ASSERT_EQ(sample->size(), 3u);
    const RowColumn* const number = sample->layout().find("NUMBER");
    ASSERT_NE(number, nullptr);
    EXPECT_EQ(number->integer(sample->row(0)), 7);
    EXPECT_EQ(number->integer(sample->row(2)), 9);
    EXPECT_EQ(sample->layout().find("TEXT")->text(sample->row(1)), "text");
}

TEST_F(SampleTest, MayHaveNoRows) {
    const auto sample = Sample::take("TESTTABLE", {numberCondition("NUMBER", INTF_GREATER, 60)});
    ASSERT_TRUE(sample);
    EXPECT_EQ(sample->size(), 0u);
    EXPECT_EQ(sample->layout().columns().size(), 4u);
}

TEST_F(SampleTest, IsRefusedWithoutATableOrARequest) {
    EXPECT_FALSE(Sample::take("NOTABLE", {}));
    manager.gives = false;
    EXPECT_FALSE(Sample::take("TESTTABLE", {}));
}

TEST_F(SampleTest, SeveralThreadsSampleAtOnce) {
    std::vector<std::thread> threads;
    for (int limit = 0; limit < 8; ++limit) {
        threads.emplace_back([limit] {
            for (int round = 0; round < 50; ++round) {
                const auto sample =
                    Sample::take("TESTTABLE", {numberCondition("NUMBER", INTF_LESS, limit)});
                ASSERT_TRUE(sample);
                ASSERT_EQ(sample->size(), static_cast<std::size_t>(limit));
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
}

} // namespace
