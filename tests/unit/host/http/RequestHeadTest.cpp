#include "host/http/RequestHead.h"

#include <gtest/gtest.h>

#include <string>

namespace {

const std::string post = "POST /a HTTP/1.1\r\nHost: h\r\n";

int statusOf(const std::string& head) {
    const IncomingRequest incoming = RequestHead::read(head);
    return incoming.problem ? incoming.problem->status : 200;
}

TEST(RequestHeadTest, TakesARequestApart) {
    const IncomingRequest incoming = RequestHead::read(
        "GET /a/b%20c?x=1&y=%2F#end HTTP/1.1\r\nhost:h:1\r\nORIGIN: http://h:1\r\n"
        "Authorization: \t Bearer a%41+b \t\r\nAccept: text/html\r\n"
        "Last-Event-ID: 7\r\nX-Empty:\r\nX-Twice: 1\r\nX-Twice: 2");
    EXPECT_FALSE(incoming.problem);
    EXPECT_EQ(incoming.request.method, "GET");
    EXPECT_EQ(incoming.request.path, "/a/b%20c");
    EXPECT_EQ(incoming.rawQuery, "x=1&y=%2F");
    EXPECT_EQ(incoming.headers.host, "h:1");
    EXPECT_EQ(incoming.headers.origin, "http://h:1");
    EXPECT_EQ(incoming.headers.authorization, "Bearer a%41+b") << "nothing is decoded";
    EXPECT_EQ(incoming.request.accept, "text/html");
    EXPECT_EQ(incoming.request.lastEventId, "7");
    EXPECT_FALSE(incoming.hasBody);
    EXPECT_FALSE(incoming.isLast);
}

TEST(RequestHeadTest, TheHostMayStandInTheTarget) {
    const IncomingRequest whole =
        RequestHead::read("GET HTTP://localhost:7186/a?b HTTP/1.1\r\nHost: other");
    EXPECT_EQ(whole.headers.host, "localhost:7186");
    EXPECT_EQ(whole.request.path, "/a");
    EXPECT_EQ(whole.rawQuery, "b");
    const IncomingRequest bare = RequestHead::read("GET https://evil?/healthz HTTP/1.1\r\nHost: h");
    EXPECT_EQ(bare.headers.host, "evil");
    EXPECT_EQ(bare.request.path, "");
    EXPECT_EQ(bare.rawQuery, "/healthz");
}

TEST(RequestHeadTest, ABodyHasALengthOrComesInChunks) {
    const IncomingRequest withLength = RequestHead::read(post + "Content-Length: 12");
    EXPECT_TRUE(withLength.hasBody);
    EXPECT_EQ(withLength.length, 12u);
    EXPECT_FALSE(withLength.isChunked || withLength.isLast);
    const IncomingRequest empty = RequestHead::read(post + "Content-Length: 0");
    EXPECT_FALSE(empty.hasBody || empty.problem);
    const IncomingRequest chunked = RequestHead::read(post + "Transfer-Encoding: chunked");
    EXPECT_TRUE(chunked.hasBody && chunked.isChunked);
    EXPECT_TRUE(chunked.isLast) << "nothing behind chunks is taken for a request";
}

TEST(RequestHeadTest, WhatTwoReadersCouldTakeForDifferentRequestsIsRefused) {
    for (const char* const line : {"Content-Length : 2",
                                   "Content-Length: %32",
                                   "Content-Length:",
                                   "Content-Length: +2",
                                   "Content-Length: 2, 2",
                                   "Content-Length: 0x2",
                                   "Content-Length: 2\nX: y",
                                   "Content-Length: 99999999999999999999",
                                   "Content-Length: 2\r\ncontent-length: 2",
                                   "Content-Length: 2\r\nTransfer-Encoding: chunked",
                                   "Transfer-Encoding: chunke%64",
                                   "Transfer-Encoding: Chunked",
                                   "Transfer-Encoding: gzip, chunked",
                                   "Transfer-Encoding:",
                                   "Transfer-Encoding: \vchunked",
                                   "Transfer-Encoding:\r\n chunked",
                                   "Transfer-Encoding: chunked\r\nTransfer-Encoding: chunked",
                                   "X: y\r\n z: w",
                                   "X: y\rTransfer-Encoding: chunked",
                                   "no header",
                                   ": no name",
                                   " X: y",
                                   "X\t: y",
                                   "Content-Encoding: gzip",
                                   "X: a\x7f"}) {
        EXPECT_EQ(statusOf(post + line), 400) << line;
    }
    EXPECT_EQ(statusOf(post + "X: a" + std::string(1, '\0')), 400);
    EXPECT_EQ(statusOf(post + "X: \ta\t\xc3\xa9"), 200) << "tabs and other bytes harm nobody";
    for (const char* const name :
         {"host", "Origin", "Authorization", "Content-Type", "Last-Event-ID"}) {
        const IncomingRequest twice =
            RequestHead::read(std::string("GET / HTTP/1.1\r\n") + name + ": 1\r\n" + name + ": 1");
        ASSERT_TRUE(twice.problem) << name;
        EXPECT_EQ(twice.problem->detail, "the header comes more than once");
    }
}

TEST(RequestHeadTest, WhatIsNoRequestLineIsRefused) {
    for (const char* const line :
         {"", "GET", "GET /", "GET  / HTTP/1.1", "GET / HTTP/1.1 ", "GET / HTTP/1.2",
          "GET / http/1.1", "get / HTTP/1.1", "BREW / HTTP/1.1", " GET / HTTP/1.1",
          "GET /\x1b HTTP/1.1", "GET /\t HTTP/1.1", "PRI * HTTP/2.0"}) {
        EXPECT_EQ(statusOf(line), 400) << line;
    }
    const IncomingRequest brewing = RequestHead::read("BREW / HTTP/1.1");
    EXPECT_EQ(brewing.request.method, "") << "only methods that there are get into the statistics";
}

TEST(RequestHeadTest, LongTargetsAndHeadersAreRefused) {
    const std::string most(RequestHead::largestTarget - 1, 'x');
    EXPECT_EQ(statusOf("GET /" + most + " HTTP/1.1"), 200);
    EXPECT_EQ(statusOf("GET /" + most + "x HTTP/1.1"), 414);
    const std::string line = "X:" + std::string(RequestHead::largestLine - 2, 'x');
    EXPECT_EQ(statusOf(post + line), 200);
    EXPECT_EQ(statusOf(post + line + "x"), 431);
}

TEST(RequestHeadTest, TheClientSaysWhetherItsConnectionLivesOn) {
    const auto isLast = [](const std::string& head) { return RequestHead::read(head).isLast; };
    EXPECT_FALSE(isLast(post + "Connection: keep-alive"));
    EXPECT_TRUE(isLast(post + "Connection: close"));
    EXPECT_TRUE(isLast(post + "Connection: x, Close ,y"));
    EXPECT_TRUE(isLast(post + "Connection: x\r\nConnection: CLOSE"));
    EXPECT_FALSE(isLast(post + "Connection: closed"));
    EXPECT_TRUE(isLast("GET / HTTP/1.0\r\nHost: h"));
    EXPECT_FALSE(isLast("GET / HTTP/1.0\r\nHost: h\r\nConnection: Keep-Alive"));
}

} // namespace
