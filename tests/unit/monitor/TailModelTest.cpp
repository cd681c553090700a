#include "TestLog.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <filesystem>
#include <numeric>
#include <random>

using namespace zrm;

namespace {

/// The expected result of following a file, computed in the simplest way.
class Model {
public:
    explicit Model(const std::string& content) : m_consumed(content.size()) {}

    /// Checks the file once and adds the pieces to report.
    void look(const std::string& content) {
        if (content.size() < m_consumed) {
            ++warnings;
        }
        for (std::size_t at = m_consumed; at < content.size(); at += pieces.back().size()) {
            const std::size_t newline = content.find('\n', at);
            const std::size_t end = newline == std::string::npos ? content.size() : newline + 1;
            pieces.push_back(content.substr(at, std::min<std::size_t>(end - at, 2047)));
        }
        m_consumed = content.size();
    }
    std::int64_t rejected() const {
        return std::count_if(pieces.begin(), pieces.end(),
                             [](const std::string& piece) { return piece.substr(0, 3) == "bad"; });
    }
    std::size_t consumed() const { return m_consumed; }

    std::vector<std::string> pieces;
    int warnings = 0;

private:
    std::size_t m_consumed;
};

class TailModel : public MonitoredFile {
protected:
    /// Some text: whole lines, the beginning of one, the rest of one, very long ones.
    std::string someText() {
        std::string text;
        for (unsigned lines = random() % 4; lines > 0; --lines) {
            if (random() % 5 == 0) {
                text += "bad";
            }
            const unsigned longest = random() % 10 == 0 ? 7000 : 60;
            text.append(random() % longest, static_cast<char>('a' + random() % 26));
            text += '\n';
        }
        if (random() % 3 == 0) {
            text.append(random() % 3000, 'p');
        }
        return text;
    }

    unsigned random() { return static_cast<unsigned>(m_engine()); }

    unsigned m_seed = std::random_device{}();
    std::mt19937 m_engine{m_seed};
};

TEST_F(TailModel, RandomChangesOfTheFileAgreeWithTheModel) {
    SCOPED_TRACE("seed " + std::to_string(m_seed));
    for (int round = 0; round < 20; ++round) {
        std::string content = someText();
        m_directory.write("messages", content);
        TestLog log(*m_line);
        RecordingTrace trace(TRC1_ERROR);
        log.openLogAndSeek();
        Model model(content);
        for (int step = 0; step < 50; ++step) {
            for (unsigned changes = random() % 3; changes > 0; --changes) {
                if (random() % 5 == 0) {
                    content.resize(content.empty() ? 0 : random() % content.size());
                    std::filesystem::resize_file(m_path, content.size());
                } else {
                    const std::string text = someText();
                    append(text);
                    content += text;
                }
            }
            {
                const Fault end("select", EINVAL); // one check
                log.follow();
            }
            model.look(content);
            ASSERT_EQ(log.lines, model.pieces);
            ASSERT_EQ(log.eof(), static_cast<std::int64_t>(model.consumed()));
            ASSERT_EQ(log.numEvents(), static_cast<std::int64_t>(model.pieces.size()));
            ASSERT_EQ(log.numFormatErrors(), model.rejected());
        }
        const auto messages = trace.messages();
        EXPECT_EQ(std::count_if(
                      messages.begin(), messages.end(),
                      [](const std::string& text) { return text.compare(0, 8, "Warning:") == 0; }),
                  model.warnings);
        log.closeLog();
    }
}

TEST_F(TailModel, EveryByteAppendedConcurrentlyIsReportedOnceAndInOrder) {
    SCOPED_TRACE("seed " + std::to_string(m_seed));
    append("before");
    TestLog log(*m_line);
    log.startThread();
    ASSERT_TRUE(waitUntil([&] { return log.eof() == 6; }));
    std::string appended;
    for (int step = 0; step < 300; ++step) {
        const std::string text = someText();
        append(text);
        appended += text;
        if (random() % 10 == 0) {
            log = *m_line; // a reconfiguration leaves a running monitor alone
        }
    }
    ASSERT_TRUE(
        waitUntil([&] { return log.eof() == static_cast<std::int64_t>(6 + appended.size()); }));
    log.stopThread();
    EXPECT_EQ(std::accumulate(log.lines.begin(), log.lines.end(), std::string()), appended);
    for (const std::string& line : log.lines) {
        EXPECT_LE(line.size(), 2047U);
        EXPECT_FALSE(line.empty());
    }
}

} // namespace
