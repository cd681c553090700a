// After each line, the row that a log keeps equals a row built from scratch.

#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"
#include "logtypes/AdminLogFile.h"

#include "AccountingRecords.h"
#include "SyslogTest.h"
#include "UserLogTest.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <random>
#include <string>
#include <string_view>
#include <vector>

using namespace zrm;

namespace {

class Members : public LogFile {
public:
    using LogFile::ownRow;
};

template <typename Log> zrm_rmlogent_data_t* ownRow(Log& log) {
    return (static_cast<LogFile&>(log).*(&Members::ownRow))();
}

std::string_view bytesOf(const zrm_rmlogent_data_t& row) {
    return {reinterpret_cast<const char*>(&row), sizeof row};
}

/// Formats the entry into the log's own row and into a fresh one, and compares all of their bytes.
template <typename Log> void expectSameRow(Log& log, const std::string& entry) {
    zrm_rmlogent_data_t fresh;
    std::memset(&fresh, '#', sizeof fresh);
    std::string text = entry;
    const long result = log.formatEntryAsRow(text.data(), &fresh, nullptr);
    text = entry;
    EXPECT_EQ(log.formatEntryAsRow(text.data(), ownRow(log), nullptr), result) << entry;
    EXPECT_EQ(bytesOf(*ownRow(log)), bytesOf(fresh)) << entry;
}

class Random {
public:
    explicit Random(unsigned seed) : m_engine(seed) {}
    std::size_t upTo(std::size_t most) {
        return std::uniform_int_distribution<std::size_t>(0, most)(m_engine);
    }
    /// A text of at most this many characters, a few of them not ASCII.
    std::string text(std::size_t most) {
        std::string result(upTo(most), 'x');
        for (char& character : result) {
            const std::size_t kind = upTo(30);
            character = static_cast<char>(kind == 0 ? 0x80 + upTo(0x7f) : 'a' + upTo(25));
        }
        return result;
    }
    template <std::size_t count> const char* oneOf(const char* const (&texts)[count]) {
        return texts[upTo(count - 1)];
    }

private:
    std::mt19937 m_engine;
};

std::string syslogLine(Random& random) {
    static constexpr const char* stamps[] = {"Oct  5 11:59:59", "Dec 31 23:59:59",
                                             "Jan 12 00:00:00", "Foo 12 00:00:00", "Oct  5 1"};
    // Shorter and longer than a column, as long as one, and longer than all columns of an entry.
    constexpr std::array<std::size_t, 5> lengths = {5, 31, 33, 90, 420};
    const auto field = [&] { return random.text(lengths[random.upTo(random.upTo(4))]); };
    std::string line = random.oneOf(stamps);
    if (random.upTo(9) > 0) {
        line += " " + field() + " ";
        line += random.upTo(9) == 0 ? "last message repeated 3 times" : field() + ": ";
        line += random.text(random.upTo(3) == 0 ? 400 : 40);
    }
    return line + "\n";
}

using Flow = std::vector<std::string>; ///< entry and exit events, in order

/// Formats the entry twice into the log's own row and returns the flow of both times. An exit event
/// carries what its operation returns, which may be a position in the entry, so both read the entry
/// from the same buffer.
template <typename Log> std::array<Flow, 2> flowsOf(Log& log, const std::string& entry) {
    std::array<Flow, 2> flows;
    std::vector<char> buffer(entry.size() + 1);
    for (Flow& flow : flows) {
        std::copy_n(entry.c_str(), buffer.size(), buffer.begin());
        const RecordingTrace trace(TRC1_FLOW);
        log.formatEntryAsRow(buffer.data(), ownRow(log), nullptr);
        flow = trace.events();
    }
    return flows;
}

class OwnRowOfASyslog : public SyslogTest {};
class OwnRowOfAUserLog : public UserLogTest {};

TEST_F(OwnRowOfASyslog, HasTheSameFlowOfOperationsForEveryEntry) {
    const std::string line = "Oct  5 11:59:59 web1 sshd[4]: text\n";
    const auto [first, second] = flowsOf(*m_log, line);
    EXPECT_EQ(std::count(first.begin(), first.end(), "LogFile.cpp entry"), 2)
        << "the row's preparation and its common columns";
    EXPECT_EQ(second, first);
    expectSameRow(*m_log, line);
}

TEST_F(OwnRowOfAUserLog, HasTheSameFlowOfOperationsForEveryEntry) {
    makeLog(R"(A,"%d %[^\n]", day description)");
    const auto [first, second] = flowsOf(*m_log, "5 text\n");
    EXPECT_EQ(std::count(first.begin(), first.end(), "LogFile.cpp entry"), 2);
    EXPECT_EQ(second, first);
}

TEST_F(OwnRowOfASyslog, EqualsAFreshRow) {
    Random random(1);
    for (int i = 0; i < 4000 && !HasFailure(); ++i) {
        expectSameRow(*m_log, syslogLine(random));
    }
}

TEST_F(OwnRowOfASyslog, EqualsAFreshRowWhenNothingCanBeConverted) {
    Random random(2);
    for (int i = 0; i < 400 && !HasFailure(); ++i) {
        LocaleDouble::setCodePage(random.upTo(1) == 0 ? 0 : LocaleDouble::latin1Page);
        expectSameRow(*m_log, syslogLine(random));
    }
    LocaleDouble::reset();
}

TEST_F(OwnRowOfAUserLog, EqualsAFreshRow) {
    makeLog(R"(A,"%d %s %s %400[^\n]", day type source description)");
    Random random(3);
    for (int i = 0; i < 4000 && !HasFailure(); ++i) {
        const std::string day = random.upTo(9) == 0 ? "no day" : std::to_string(random.upTo(40));
        expectSameRow(*m_log, day + " " + random.text(20) + " " + random.text(50) + " " +
                                  random.text(random.upTo(3) == 0 ? 500 : 40) + "\n");
    }
}

TEST_F(OwnRowOfASyslog, OfAFollowedLogEqualsAFreshRow) {
    struct FollowedLog : SysLogFile {
        explicit FollowedLog(const ValidLog& log) : SysLogFile(log, Unmonitored{}) {}
    };
    FollowedLog log(ValidLog(FurtherLog{m_path, 'S', 'N', "",
                                        std::make_shared<const FollowSettings>(FollowSettings{})}));
    constexpr std::array<const char*, 3> heads = {"", "2006-10-05T11:59:58.25Z ",
                                                  "<34>1 2006-10-05T11:59:58Z "};
    Random random(5);
    for (int i = 0; i < 4000 && !HasFailure(); ++i) {
        const std::string line = syslogLine(random);
        const char* const head = heads[random.upTo(2)];
        expectSameRow(
            log, *head == '\0' ? line : head + line.substr(std::min<std::size_t>(16, line.size())));
    }
}

TEST_F(OwnRowOfASyslog, OfAccountingRecordsEqualsAFreshRow) {
    Random random(4);
    const auto line = validLog(m_directory.write("wtmp", ""), " ;N ;A");
    const Fault fault("open", EACCES);
    AdminLogFile log(*line, nullptr);
    while (log.monitorStatus() == MONITOR_RUNNING) {
        std::this_thread::yield();
    }
    for (int i = 0; i < 1000 && !HasFailure(); ++i) {
        const AccountingRecord record{.user = random.text(8),
                                      .id = random.text(4),
                                      .line = random.text(12),
                                      .pid = static_cast<std::int16_t>(random.upTo(30000)),
                                      .type = static_cast<std::int16_t>(random.upTo(10)),
                                      .termination = static_cast<std::int16_t>(random.upTo(9)),
                                      .exit = static_cast<std::int16_t>(random.upTo(255)),
                                      .time = 1160049600};
        expectSameRow(log, record.bytes());
    }
}

} // namespace
