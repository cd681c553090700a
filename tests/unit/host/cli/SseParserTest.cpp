#include "host/cli/EventFollower.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm::host;

using testing::ElementsAre;

namespace {

class SseParserTest : public testing::Test {
protected:
    std::vector<std::string> received;
    SseParser parser{[this](const std::string& data) { received.push_back(data); }};
};

} // namespace

TEST_F(SseParserTest, ReturnsTheDataOfEachEvent) {
    parser.take("id: 1\nevent: event\ndata: {\"id\":1}\n\n: keep-alive\n\ndata: x\n\n");
    EXPECT_THAT(received, ElementsAre("{\"id\":1}", "x"));
}

TEST_F(SseParserTest, TakesPiecesOfAnySize) {
    const std::string text = "id: 1\r\ndata: one\r\n\r\nid: 2\r\ndata: two\r\n\r\n";
    for (const char c : text) {
        parser.take({&c, 1});
    }
    EXPECT_THAT(received, ElementsAre("one", "two"));
}

TEST_F(SseParserTest, JoinsLinesOfData) {
    parser.take("data: one\ndata:two\ndata:  three\n\n");
    EXPECT_THAT(received, ElementsAre("one\ntwo\n three"));
}

TEST_F(SseParserTest, AnIncompleteEventIsNotReturned) {
    parser.take("data: one\n");
    EXPECT_THAT(received, ElementsAre());
}

TEST_F(SseParserTest, AnEventWithoutDataIsIgnored) {
    parser.take("id: 1\nevent: event\n\n\n");
    EXPECT_THAT(received, ElementsAre());
}
