#ifndef ZRM_TESTS_HISTORY_FIXTURE_H
#define ZRM_TESTS_HISTORY_FIXTURE_H

#include "TestBatch.h"
#include "host/history/History.h"
#include "support/FaultyDisk.h"
#include "support/ReasonOf.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "unit/host/events/TestEvents.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

using namespace zrm::host;

/// A history in a directory of its own, with a queue that feeds it and one sink.
class HistoryFixture : public testing::Test {
protected:
    using Clock = HistoryWriter::Clock;

    ~HistoryFixture() override { close(); }

    /// Opens the history and starts it on a new queue; its message is in `message`.
    void open() {
        testing::internal::CaptureStderr();
        auto opened = History::open(config, state);
        message = testing::internal::GetCapturedStderr();
        problem = reasonOf(opened);
        if (!opened) {
            return;
        }
        history = std::move(*opened);
        sink = history->source("key", "the sink");
        queue = std::make_unique<EventQueue>(100, sizeof(TestRow), history->newest());
        history->start(*queue, EventJson(testLayout()));
    }
    /// Stops the history in order, as far as possible.
    void close(std::chrono::milliseconds time = std::chrono::seconds(10)) {
        if (history != nullptr) {
            history->finish(Clock::now() + time);
            history->storeRest();
        }
        sink.reset();
        history.reset();
        queue.reset();
    }
    void push(int count) {
        TestRow row("/var/log/", "app.log", "text", 7);
        for (int number = 0; number < count; ++number) {
            ASSERT_TRUE(queue->push(label, row.bytes()));
        }
    }
    void pushAndWait(int count) {
        const std::uint64_t last = history->newest() + static_cast<std::uint64_t>(count);
        push(count);
        EXPECT_GE(history->waitBeyond(last - 1, Clock::now() + std::chrono::seconds(10), {}), last);
        // The room in the queue is released after the events become visible.
        EXPECT_TRUE(eventually([&] { return queue->state().size == 0; }));
    }
    static bool eventually(const std::function<bool()>& condition) {
        const auto limit = Clock::now() + std::chrono::seconds(10);
        while (!condition() && Clock::now() < limit) {
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        return condition();
    }
    std::vector<std::uint64_t> ids() {
        std::vector<std::uint64_t> ids;
        const EventPage page = history->query({.limit = 100'000, .newestFirst = false}).value();
        for (const StoredEvent& event : page.events) {
            ids.push_back(event.id);
        }
        return ids;
    }
    /// Delivers to the sink what it would get now, at most `most` events. A read returns no more
    /// than one batch of the writer.
    std::vector<std::uint64_t> take(std::size_t most = SIZE_MAX) {
        std::vector<std::uint64_t> ids;
        while (ids.size() < most && sink->backlog() > 0) {
            const auto events = sink->read(std::min<std::size_t>(10, most - ids.size()));
            for (const EventRecord& event : events) {
                ids.push_back(event.id);
            }
            sink->release(events.size());
        }
        return ids;
    }
    std::vector<std::string> corruptFiles() const {
        std::vector<std::string> names;
        for (const auto& entry : std::filesystem::directory_iterator(state)) {
            if (entry.path().filename().string().starts_with("history.db.corrupt-")) {
                names.push_back(entry.path());
            }
        }
        return names;
    }
    std::string file() const { return state + "/history.db"; }
    void run(const std::string& sql) const { Database(file(), Database::Use::WRITE).run(sql); }
    std::int64_t number(const std::string& sql) const {
        return Database(file(), Database::Use::READ).number(sql);
    }

    RecordingTrace trace{TRC1_ERROR};
    FaultyDisk disk;
    TemporaryDirectory directory;
    std::string state = directory.file("state");
    HistoryConfig config;
    std::string message;
    std::string problem;
    std::shared_ptr<const SituationLabel> label =
        std::make_shared<const SituationLabel>(SituationLabel{"watch", "minor"});
    std::unique_ptr<EventQueue> queue;
    std::unique_ptr<History> history;
    std::unique_ptr<EventSource> sink;
};

#endif
