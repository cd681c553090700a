#include "host/api/ReportStream.h"

#include "framework/cancellation.h"
#include "logs/zrm_rmlogent_data.h"
#include "support/RecordingTrace.h"
#include "tables/zrm_rmlogent_manager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <cstring>
#include <functional>
#include <memory>
#include <mutex>
#include <sstream>
#include <stdexcept>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include <nlohmann/json.hpp>

using namespace zrm;
using namespace zrm::host;

namespace {

using Json = nlohmann::json;

/// A client that takes what it is sent when a test says so.
class Client : public BodyChannel {
public:
    void send(std::string text) override {
        const std::lock_guard guard(m_mutex);
        m_text += m_isOpen ? text : "";
        m_isReady = m_takesAll;
        ++m_parts;
        m_changed.notify_all();
    }
    bool isReady() const override {
        const std::lock_guard guard(m_mutex);
        return m_isReady;
    }
    bool isOpen() const override {
        const std::lock_guard guard(m_mutex);
        return m_isOpen;
    }
    void end() override {
        const std::lock_guard guard(m_mutex);
        m_isEnded = true;
    }

    void becomeSlow() { m_takesAll = false; }
    void take() {
        const std::lock_guard guard(m_mutex);
        m_isReady = true;
    }
    void leave() {
        const std::lock_guard guard(m_mutex);
        m_isOpen = false;
    }
    /// Waits until so many parts have been sent.
    void waitFor(int parts) {
        std::unique_lock lock(m_mutex);
        EXPECT_TRUE(
            m_changed.wait_for(lock, std::chrono::seconds(60), [&] { return m_parts >= parts; }));
    }
    std::string text() const {
        const std::lock_guard guard(m_mutex);
        return m_text;
    }
    bool isEnded() const {
        const std::lock_guard guard(m_mutex);
        return m_isEnded;
    }
    int parts() const {
        const std::lock_guard guard(m_mutex);
        return m_parts;
    }

private:
    mutable std::mutex m_mutex; ///< guards what follows
    std::condition_variable m_changed;
    std::string m_text;
    bool m_takesAll = true;
    bool m_isReady = true;
    bool m_isOpen = true;
    bool m_isEnded = false;
    int m_parts = 0;
};

class ReportStreamTest : public testing::Test {
protected:
    using Work = std::function<LogReport::Result(LogReport::Receiver&)>;

    /// A report on no log, whose rows a test gives.
    class Report : public LogReport {
    public:
        Report(const ReportQuery& query, TableManager& entries, Work work)
            : LogReport(query, entries), m_work(std::move(work)) {}
        Result run(Receiver& receiver) override { return m_work(receiver); }

    private:
        const Work m_work;
    };

    void begin(ReportStream::Form form, Work work, std::vector<std::string> fields = {}) {
        ReportQuery query;
        query.fields = std::move(fields);
        query.log = "/var/log/app.log";
        query.limit = 7;
        stream = std::make_unique<ReportStream>(
            query, std::make_unique<Report>(query, entries, std::move(work)), form);
    }
    void run() {
        stream->attach(client);
        stream->run();
    }
    static void give(LogReport::Receiver& receiver, const std::string& description,
                     const LogReport::Fields& fields = {}) {
        zrm_rmlogent_data_t row;
        std::memset(&row, ' ', sizeof row);
        row.freqthresh = row.periodthrs = row.sampleno = row.rowno = 0;
        description.copy(row.entrydesc, sizeof row.entrydesc);
        receiver.row(reinterpret_cast<const char*>(&row), fields);
    }
    static LogReport::Result giveTwo(LogReport::Receiver& receiver) {
        give(receiver, "one");
        receiver.progress(5, 10);
        give(receiver, "two");
        LogReport::Result result;
        result.count = 2;
        result.skipped = 3;
        return result;
    }
    /// Gives more than the stream keeps to itself. Returns how many rows it took until the report
    /// was not wanted any more.
    static int giveUntilCancelled(LogReport::Receiver& receiver) {
        int rows = 0;
        for (; rows < 100'000 && !CTX1_IsCancelled(); ++rows) {
            give(receiver, "a row");
        }
        return rows;
    }

    RecordingTrace trace{TRC1_ERROR};
    zrm_rmlogent_manager entries{"ZRM", "RMLOGENT"};
    std::shared_ptr<Client> client = std::make_shared<Client>();
    std::unique_ptr<ReportStream> stream;
};

TEST_F(ReportStreamTest, WritesADocument) {
    begin(ReportStream::Form::document, giveTwo);
    run();
    const Json answer = Json::parse(client->text());
    EXPECT_EQ(answer["log"], "/var/log/app.log");
    EXPECT_EQ(answer["limit"], 7);
    ASSERT_EQ(answer["rows"].size(), 2U);
    EXPECT_EQ(answer["rows"][1]["ENTRYDESC"], "two");
    EXPECT_FALSE(answer["rows"][1].contains("fields"));
    EXPECT_EQ(answer["count"], 2);
    EXPECT_EQ(answer["skipped"], 3);
    EXPECT_EQ(answer["complete"], true);
    EXPECT_TRUE(client->isEnded());
}

TEST_F(ReportStreamTest, RowsHaveFieldsWhereTheyWereAskedFor) {
    const auto giveThree = [](LogReport::Receiver& receiver) {
        give(receiver, "one", {R"({"status":"500"})", false});
        give(receiver, "two", {R"({"status":"5"})", true});
        give(receiver, "three");
        return LogReport::Result();
    };
    begin(ReportStream::Form::document, giveThree, {"status"});
    run();
    const Json rows = Json::parse(client->text())["rows"];
    EXPECT_EQ(rows[0]["fields"], (Json{{"status", "500"}}));
    EXPECT_FALSE(rows[0].contains("fields_cut"));
    EXPECT_EQ(rows[1]["fields_cut"], true);
    EXPECT_EQ(rows[2]["fields"], Json::object());
    EXPECT_EQ(rows[2]["ENTRYDESC"], "three");
}

TEST_F(ReportStreamTest, WritesLinesWithTheProgress) {
    begin(ReportStream::Form::lines, giveTwo);
    run();
    std::istringstream lines(client->text());
    std::vector<Json> read;
    for (std::string line; std::getline(lines, line);) {
        read.push_back(Json::parse(line));
    }
    ASSERT_EQ(read.size(), 5U);
    EXPECT_EQ(read[0]["begin"]["log"], "/var/log/app.log");
    EXPECT_EQ(read[1]["row"]["ENTRYDESC"], "one");
    EXPECT_EQ(read[2]["progress"], (Json{{"read", 5}, {"total", 10}}));
    EXPECT_EQ(read[3]["row"]["ENTRYDESC"], "two");
    EXPECT_EQ(read[4]["end"]["count"], 2);
    EXPECT_TRUE(client->isEnded());
}

TEST_F(ReportStreamTest, GoesNoFurtherAheadOfASlowClientThanABlock) {
    constexpr int rows = 1000;
    begin(ReportStream::Form::lines, [](LogReport::Receiver& receiver) {
        for (int row = 0; row < rows; ++row) {
            give(receiver, std::to_string(row));
        }
        return LogReport::Result{};
    });
    client->becomeSlow();
    std::thread thread([this] { run(); });
    for (int parts = 1; !client->isEnded(); ++parts) {
        client->waitFor(parts);
        if (parts < 4) {
            EXPECT_EQ(client->parts(), parts); // the next waits
        }
        client->take();
        stream->wake();
        if (client->text().find("\"end\"") != std::string::npos) {
            break;
        }
    }
    thread.join();
    const std::string text = client->text();
    EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), rows + 2);
    EXPECT_TRUE(client->isEnded());
}

TEST_F(ReportStreamTest, EndsWhenTheClientLeaves) {
    int given = 0;
    begin(ReportStream::Form::lines, [&](LogReport::Receiver& receiver) {
        client->leave();
        given = giveUntilCancelled(receiver);
        return LogReport::Result{};
    });
    run();
    EXPECT_LT(given, 100'000);
    EXPECT_EQ(client->text(), "");
    EXPECT_TRUE(client->isEnded());
}

TEST_F(ReportStreamTest, ReadsNothingIfNobodyWaitsForIt) {
    bool hasRun = false;
    begin(ReportStream::Form::lines, [&](LogReport::Receiver&) {
        hasRun = true;
        return LogReport::Result{};
    });
    stream->cancel();
    stream->run();
    EXPECT_FALSE(hasRun);
    stream->attach(client); // too late
    EXPECT_TRUE(client->isEnded());
}

TEST_F(ReportStreamTest, AnAnswerThatFailsHasNoEnd) {
    begin(ReportStream::Form::lines, [](LogReport::Receiver& receiver) -> LogReport::Result {
        give(receiver, "one");
        throw std::runtime_error("no memory");
    });
    run();
    EXPECT_EQ(client->text().find("\"end\""), std::string::npos);
    EXPECT_TRUE(client->isEnded());
    EXPECT_THAT(trace.messages(),
                testing::ElementsAre("A report on /var/log/app.log failed: no memory"));
}

} // namespace
