#include "host/sources/StreamEntries.h"

#include "framework/LogEntry.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <cstring>
#include <optional>
#include <random>
#include <string>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;

/// A line that begins with a blank continues the one before it; none continues "end".
class Indented final : public LineJoin {
public:
    explicit Indented(const Limits& limits) : LineJoin(limits) {}
    const std::string& definition() const noexcept override { return m_definition; }

protected:
    bool continues(std::string_view /*before*/, std::string_view line) const override {
        return line.starts_with(' ');
    }
    bool mayBeContinued(std::string_view line) const override { return line != "end"; }

private:
    const std::string m_definition = "indented";
};

class StreamEntriesTest : public testing::Test {
protected:
    StreamEntriesTest() { limits.wait = 1h; }

    /// The entries that there are once this text has come.
    std::vector<std::string> after(const std::string& text) {
        for (std::size_t at = 0; at < text.size();) {
            std::vector<std::string> some = given();
            found.insert(found.end(), some.begin(), some.end());
            const auto [room, size] = entries->room();
            const std::size_t count = std::min(size, text.size() - at);
            std::memcpy(room, text.data() + at, count);
            entries->add(count);
            at += count;
        }
        std::vector<std::string> some = given();
        found.insert(found.end(), some.begin(), some.end());
        return std::exchange(found, {});
    }
    std::vector<std::string> given() {
        std::vector<std::string> texts;
        while (const char* const entry = entries->next()) {
            EXPECT_EQ(entries->text(), entry);
            texts.emplace_back(entries->isCut() ? "(cut) " : "");
            texts.back() += entries->text();
        }
        return texts;
    }
    void join() {
        rules.emplace(limits);
        entries.emplace(&*rules);
    }

    LineJoin::Limits limits;
    std::optional<Indented> rules;
    std::optional<StreamEntries> entries{nullptr};
    std::vector<std::string> found;
};

TEST_F(StreamEntriesTest, WithoutAJoinEachLineIsAnEntry) {
    EXPECT_THAT(after("a\n b\r\nc"), ElementsAre("a", " b"));
    entries->end();
    EXPECT_THAT(given(), ElementsAre("c"));
    EXPECT_THAT(given(), IsEmpty());
    EXPECT_EQ(entries->patience(1s), 1s);
}

TEST_F(StreamEntriesTest, LinesThatContinueAreJoined) {
    join();
    EXPECT_THAT(after("a\n b\r\n c\nd\n"), ElementsAre("a\n b\n c"));
    EXPECT_THAT(after(" e\nend\n f\nend\n"), ElementsAre("d\n e", "end", " f", "end"));
    EXPECT_THAT(after("x\n y"), IsEmpty());
    entries->end();
    EXPECT_THAT(given(), ElementsAre("x\n y"));
    entries->begin();
    EXPECT_THAT(after(" z\n"), IsEmpty());
    entries->end();
    EXPECT_THAT(given(), ElementsAre(" z")) << "a new stream does not continue the last one";
}

TEST_F(StreamEntriesTest, LimitsEndAnEntry) {
    limits.lines = 2;
    limits.bytes = 10;
    join();
    EXPECT_THAT(after("a\n b\n c\n d\n e\nf\n"), ElementsAre("a\n b", " c\n d", " e"));
    EXPECT_THAT(after(" 3456\n f\n"), ElementsAre("f\n 3456")); // ten bytes with its line ends
    EXPECT_THAT(after("123\n 12345\nend\n"), ElementsAre(" f", "123", " 12345", "end"));
}

TEST_F(StreamEntriesTest, ALineThatIsTooLongIsAnEntryOfItsOwn) {
    join();
    const std::string text(EntryKeep::longestText + 5, 'x');
    const std::string kept = "(cut) " + text.substr(0, EntryKeep::longestText);
    EXPECT_THAT(after("a\n" + text + "\n b\nend\n"), ElementsAre("a", kept, " b", "end"));
}

TEST_F(StreamEntriesTest, AreThoseOfAPlainModelHoweverTheStreamIsCut) {
    std::mt19937 random{20261122};
    for (int round = 0; round < 200; ++round) {
        limits.lines = 2 + random() % 4;
        limits.bytes = 10 + random() % 60;
        join();
        std::string stream;
        std::vector<std::string> expected;
        std::string last = "end";
        std::size_t lines = 0;
        for (int line = 0; line < 100; ++line) {
            std::string text(random() % 30, 'x');
            text = random() % 6 == 0 ? "end" : random() % 3 > 0 ? ' ' + text : text;
            stream += text + '\n';
            const bool isJoined = lines > 0 && last != "end" && text.starts_with(' ') &&
                                  lines < limits.lines &&
                                  expected.back().size() + text.size() + 2 <= limits.bytes;
            if (isJoined) {
                expected.back() += '\n' + text;
            } else {
                expected.push_back(text);
            }
            lines = isJoined ? lines + 1 : 1;
            last = text;
        }
        std::vector<std::string> read;
        while (!stream.empty()) {
            const std::string part = stream.substr(0, 1 + random() % 50);
            stream.erase(0, part.size());
            const std::vector<std::string> some = after(part);
            read.insert(read.end(), some.begin(), some.end());
        }
        entries->end();
        const std::vector<std::string> some = given();
        read.insert(read.end(), some.begin(), some.end());
        ASSERT_EQ(read, expected) << "round " << round;
    }
}

TEST_F(StreamEntriesTest, TheLastLinesWaitNoLongerThanTheirTime) {
    limits.wait = 50ms;
    join();
    EXPECT_THAT(after("a\n b\n"), IsEmpty());
    EXPECT_LE(entries->patience(1h), 50ms);
    std::vector<std::string> texts;
    while (texts.empty()) {
        std::this_thread::sleep_for(entries->patience(1h));
        texts = given();
    }
    EXPECT_THAT(texts, ElementsAre("a\n b"));
    EXPECT_EQ(entries->patience(1h), 1h);
}

} // namespace
