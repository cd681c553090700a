#include "host/history/EntryRecorder.h"

#include "host/framework/Tables.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "unit/host/framework/TestTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::Optional;

/// The test table with its number under the name of the count.
class CountingRequest : public TestRequest {
public:
    using TestRequest::TestRequest;
    unsigned GetColumnInfo(ColumnInfo* info, int index) override {
        TestRequest::GetColumnInfo(info, index);
        if (std::strcmp(info->name, "number") == 0) {
            info->name = "numevents";
        }
        return 0;
    }
};

class CountingManager : public TestManager {
public:
    CountingManager() : TestManager("RMMONLOG") {}
    ctreq* CreateCtreq(RequestDetail* detail, ContextInfo* context) override {
        auto* const request = new CountingRequest(detail, context, this);
        request->onSample = [this](TestRequest& sampled) {
            for (const auto& [name, count] : counts) {
                TestRow row("/var/log/", name, "", count);
                sampled.InsertRow(row.bytes());
            }
        };
        return request;
    }
    std::map<std::string, std::int32_t> counts;
};

class EntryRecorderTest : public testing::Test {
protected:
    EntryRecorderTest() {
        TableManager::RegisterWithManager(&logs);
        history = std::move(History::open({}, directory.file("state")).value());
        recorder = std::make_unique<EntryRecorder>(*history,
                                                   [this] { return std::exchange(learned, {}); });
    }
    ~EntryRecorderTest() override { Tables::clear(); }

    static constexpr std::int64_t minute = 60'000;
    static constexpr std::int64_t start = 29'000'000 * minute;

    RecordingTrace trace{0};
    TemporaryDirectory directory;
    CountingManager logs;
    std::vector<LogSilence> learned;
    std::unique_ptr<History> history;
    std::unique_ptr<EntryRecorder> recorder;
};

TEST_F(EntryRecorderTest, RecordsTheEntriesOfEachMinuteAndLog) {
    recorder->tick(start + 30'000);
    logs.counts = {{"a.log", 10}};
    recorder->tick(start + 59'999);
    logs.counts = {{"a.log", 12}, {"quiet.log", 0}};
    recorder->tick(start + minute); // the first minute had 12
    logs.counts = {{"a.log", 20}, {"b.log", 3}, {"quiet.log", 0}};
    recorder->tick(start + 2 * minute); // the second had 8 and 3
    logs.counts = {{"a.log", 5}, {"b.log", 3}};
    recorder->tick(start + 5 * minute); // a.log started over; nothing was recorded for two minutes
    logs.counts = {{"a.log", 6}, {"b.log", 4}};
    recorder->finish();
    history->storeRest();
    const Rates rates = history->rates(start, start + 6 * minute, minute).value();
    ASSERT_EQ(rates.logs.size(), 2u);
    EXPECT_EQ(rates.logs[0].log, "/var/log/a.log");
    EXPECT_THAT(rates.logs[0].entries, ElementsAre(Optional(12u), Optional(8u), Optional(5u),
                                                   std::nullopt, std::nullopt, Optional(1u)));
    EXPECT_EQ(rates.logs[1].log, "/var/log/b.log");
    EXPECT_THAT(rates.logs[1].entries, ElementsAre(Optional(0u), Optional(3u), Optional(0u),
                                                   std::nullopt, std::nullopt, Optional(1u)));
}

TEST_F(EntryRecorderTest, WithoutATickThereIsNothingToRecord) {
    logs.counts = {{"a.log", 10}};
    recorder->finish();
    history->storeRest();
    EXPECT_TRUE(history->rates(0, start, 24 * 60 * minute)->logs.empty());
}

TEST_F(EntryRecorderTest, KeepsWhatWasLearnedOfSilences) {
    recorder->tick(start);
    learned = {{"/var/log/a", {480'000, 60}}, {"/var/log/b", {480'000, 7200}}};
    recorder->tick(start + minute);
    learned = {{"/var/log/a", {480'000, 90}}, {"/var/log/a", {480'001, 90}}};
    recorder->tick(start + 2 * minute);
    history->storeRest();
    using Hours = std::vector<SilentHour>;
    EXPECT_THAT(history->rhythms(),
                ElementsAre(testing::Pair("/var/log/a", Hours{{480'000, 90}, {480'001, 90}}),
                            testing::Pair("/var/log/b", Hours{{480'000, 7200}})));
    learned = {{"/var/log/a", {480'000 + 2000, 5}}};
    recorder->tick(start + 3 * minute);
    history->storeRest();
    EXPECT_THAT(history->rhythms(),
                ElementsAre(testing::Pair("/var/log/a", Hours{{482'000, 5}}),
                            testing::Pair("/var/log/b", Hours{{480'000, 7200}})))
        << "what is older than six weeks is removed";
}

} // namespace
