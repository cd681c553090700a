#include "OpenDebugLog.h"
#include "TestLog.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <optional>
#include <sstream>
#include <thread>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::IsEmpty;

const std::string useTheCode =
    "Use the return code and message to investigate the failure.  Agent is terminating.";

class DebugLog : public MonitoredFile {
protected:
    std::string content() const {
        std::ifstream stream(m_debugLog, std::ios::binary);
        std::ostringstream text;
        text << stream.rdbuf();
        return text.str();
    }
    static std::string header(long number) {
        return "\t\t>>>>>>>>> RECORD " + std::to_string(number) + " <<<<<<<<<\n";
    }
    /// The number of the next record, found by writing one.
    long nextNumber() {
        TestLog log(*m_debugged);
        log.writeToDebugLog(nullptr, 0, nullptr, 0);
        const std::string text = content();
        const long number = std::stol(text.substr(text.rfind("RECORD ") + 7));
        m_seen = text.size();
        return number + 1;
    }
    /// What was written since the last call.
    std::string news() {
        const std::string text = content().substr(m_seen);
        m_seen += text.size();
        return text;
    }

    std::string m_debugLog = m_directory.file("debug");
    std::unique_ptr<ValidLog> m_debugged = validLog(m_path, " ;Y ;S");
    std::optional<OpenDebugLog> m_openDebugLog{m_debugLog};
    std::size_t m_seen = 0;
};

TEST_F(DebugLog, ARecordIsAHeaderAndBothPieces) {
    const long number = nextNumber();
    TestLog log(*m_debugged);
    log.writeToDebugLog("line\n", 5, "r\0w", 3);
    EXPECT_EQ(news(), header(number) + "line\n\n" + std::string("r\0w\n", 4));
    log.writeToDebugLog("only", 4, nullptr, 0);
    EXPECT_EQ(news(), header(number + 1) + "only\n");
    log.writeToDebugLog("empty second", 12, "", 0);
    EXPECT_EQ(news(), header(number + 2) + "empty second\n");
}

TEST_F(DebugLog, ARecordMayHaveNoPieces) {
    const long number = nextNumber();
    TestLog log(*m_debugged);
    RecordingTrace trace(TRC1_ERROR | TRC1_DETAIL);
    trace.clear();
    log.writeToDebugLog("", 0, nullptr, 5);
    EXPECT_EQ(news(), header(number));
    EXPECT_THAT(trace.messages(),
                ElementsAre("Debug file mutex locked by " + m_path + ".",
                            "Debug file mutex unlocked.", m_path + " monitor detected event."));
    log.writeToDebugLog(nullptr, 3, "second", 6);
    EXPECT_EQ(news(), header(number + 1) + "second\n");
}

TEST_F(DebugLog, SuccessIsTracedInDetail) {
    TestLog log(*m_debugged);
    RecordingTrace trace(TRC1_DETAIL);
    log.writeToDebugLog("line\n", 5, "row", 3);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Debug file mutex locked by " + m_path + ".",
                            "Debug file mutex unlocked.",
                            "Record written to debug log for log " + m_path + "."));
    trace.clear();
    trace.setLevel(TRC1_ERROR);
    log.writeToDebugLog("line\n", 5, "row", 3);
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(DebugLog, NothingIsWrittenForALogWithoutDebugMode) {
    TestLog log(*m_line);
    RecordingTrace trace(TRC1_ERROR | TRC1_DETAIL);
    log.writeToDebugLog("line\n", 5, nullptr, 0);
    EXPECT_EQ(content(), "");
    EXPECT_THAT(trace.messages(), ElementsAre(m_path + " monitor detected event."));
    trace.setLevel(TRC1_ERROR);
    trace.clear();
    log.writeToDebugLog("line\n", 5, nullptr, 0);
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(DebugLog, NothingIsWrittenWithoutADebugLog) {
    TestLog log(*m_debugged);
    m_openDebugLog.reset();
    RecordingTrace trace(TRC1_ERROR | TRC1_DETAIL);
    log.writeToDebugLog("line\n", 5, nullptr, 0);
    EXPECT_THAT(trace.messages(), ElementsAre(m_path + " monitor detected event."));
    EXPECT_EQ(content(), "");
}

TEST_F(DebugLog, AFailedWriteIsTracedAndOmitsTheSecondPiece) {
    const long number = nextNumber();
    TestLog log(*m_debugged);
    RecordingTrace trace(TRC1_ERROR);
    {
        const Fault fault("fwrite", ENOSPC);
        log.writeToDebugLog("line\n", 5, "row", 3);
    }
    EXPECT_THAT(trace.messages(), ElementsAre("Error writing " + m_path +
                                              " entry to debug log.  errno = 28; No space left on "
                                              "device"));
    EXPECT_EQ(news(), header(number));
    trace.clear();
    {
        const Fault fault("fwrite", ENOSPC, {.skip = 1});
        log.writeToDebugLog("line\n", 5, "row", 3);
    }
    EXPECT_THAT(trace.messages(), ElementsAre("Error writing " + m_path +
                                              " entry to debug log.  errno = 28; No space left on "
                                              "device"));
    EXPECT_EQ(news(), header(number + 1) + "line\n\n");
    log.writeToDebugLog("line\n", 5, "row", 3);
    EXPECT_EQ(news(), header(number + 2) + "line\n\nrow\n");
}

TEST_F(DebugLog, RecordsThatAFullDiskCutsAreReportedOnceAndCounted) {
    // Every write to this device fails, but the stream's buffer first accepts some of it.
    m_openDebugLog.reset();
    m_openDebugLog.emplace("/dev/full");
    TestLog log(*m_debugged);
    RecordingTrace trace(TRC1_ERROR);
    const std::uint64_t before = LogFile::incompleteDebugRecords();
    const std::string row(500, 'r');
    for (int number = 0; number < 10; ++number) {
        log.writeToDebugLog("line\n", 5, row.data(), row.size());
    }
    EXPECT_EQ(LogFile::incompleteDebugRecords() - before, 10u);
    const auto messages = trace.messages();
    EXPECT_EQ(std::count(messages.begin(), messages.end(),
                         "The debug log does not take whole records.  errno = 28; No space left on "
                         "device"),
              1);
    m_openDebugLog.reset();
    m_openDebugLog.emplace(m_debugLog);
    log.writeToDebugLog("line\n", 5, nullptr, 0);
    EXPECT_EQ(LogFile::incompleteDebugRecords() - before, 10u) << "it accepts whole records again";
}

TEST_F(DebugLog, EveryPieceOfALineIsCopiedWithItsRowOrWithoutOne) {
    const long number = nextNumber();
    TestLog log(*m_debugged);
    log.openLogAndSeek();
    append("good\nbad\n" + std::string("nul\0hidden\n", 11));
    EXPECT_EQ(log.readLog(), 0);
    log.closeLog();
    const auto rows = EventRecorder::rows();
    ASSERT_EQ(rows.size(), 2U);
    const auto bytes = [](const zrm_rmlogent_data_t& row) {
        return std::string(reinterpret_cast<const char*>(&row), sizeof row);
    };
    EXPECT_EQ(news(), header(number) + "good\n\n" + bytes(rows[0]) + "\n" + header(number + 1) +
                          "bad\n\n" + header(number + 2) + "nul\n" + bytes(rows[1]) + "\n");
}

TEST_F(DebugLog, ARowIsHandedOverBeforeItIsCopied) {
    // The situations write the thresholds' columns into the row; the copy shows them.
    TestLog log(*m_debugged);
    log.openLogAndSeek();
    append("one\n");
    EventRecorder::onRow([this](std::size_t) { EXPECT_EQ(content(), ""); });
    EXPECT_EQ(log.readLog(), 0);
    log.closeLog();
    EXPECT_EQ(EventRecorder::rows().size(), 1U);
    EXPECT_NE(content(), "");
    EventRecorder::clear();
}

TEST_F(DebugLog, AReconfigurationTakesEffectWithTheNextEntry) {
    TestLog log(*m_line);
    log.startThread();
    ASSERT_TRUE(waitUntil([&] { return log.eof() == 0; }));
    append("one\n");
    // The row is delivered before the line would be copied; the pass ends after both.
    ASSERT_TRUE(waitUntil([&] { return log.eof() == 4; }));
    log = *m_debugged;
    append("two\n");
    ASSERT_TRUE(waitUntil([&] { return content().find("two\n\n") != std::string::npos; }));
    log = *m_line;
    append("three\n");
    EventRecorder::waitForRows(3);
    log.stopThread();
    EXPECT_EQ(content().find("one\n"), std::string::npos);
    EXPECT_EQ(content().find("three\n"), std::string::npos);
}

TEST_F(DebugLog, RecordsOfTwoLogsNeverInterleave) {
    constexpr int count = 2000;
    const long first = nextNumber();
    const auto writer = [&](char letter) {
        TestLog log(*m_debugged);
        const std::string line(100, letter);
        const std::string row(500, letter);
        for (int i = 0; i < count; ++i) {
            log.writeToDebugLog(line.data(), line.size(), row.data(), row.size());
        }
    };
    std::thread a(writer, 'a');
    std::thread b(writer, 'b');
    a.join();
    b.join();
    std::istringstream text(news());
    std::string head;
    std::string line;
    std::string row;
    int records[2] = {0, 0};
    for (long number = first; number < first + 2 * count; ++number) {
        ASSERT_TRUE(std::getline(text, head) && std::getline(text, line) &&
                    std::getline(text, row));
        ASSERT_EQ(head + "\n", header(number));
        ASSERT_FALSE(line.empty());
        ASSERT_EQ(line, std::string(100, line[0]));
        ASSERT_EQ(row, std::string(500, line[0]));
        ++records[line[0] == 'a' ? 0 : 1];
    }
    EXPECT_FALSE(std::getline(text, head));
    EXPECT_THAT(records, ElementsAre(count, count));
}

using DebugLogDeathTest = DebugLog;

TEST_F(DebugLogDeathTest, FailuresOfItsMutexEndTheAgent) {
    const RecordingTrace trace(TRC1_ERROR);
    TestLog log(*m_debugged);
    EXPECT_EXIT(
        {
            const Fault fault("pthread_mutex_lock", EINVAL);
            log.writeToDebugLog("line\n", 5, nullptr, 0);
        },
        ExitedWithCode(255),
        exactly("Error locking mutex for debug file by " + m_path +
                ". Return code = 22; Invalid argument.  " + useTheCode));
    EXPECT_EXIT(
        {
            TestLog::lockDebugFile("the test");
            const Fault fault("pthread_mutex_unlock", EPERM);
            TestLog::unlockDebugFile();
        },
        ExitedWithCode(255),
        exactly("Error unlocking mutex for debug file.  Return code = 1; Operation not "
                "permitted.  " +
                useTheCode));
}

} // namespace
