#include "host/http/RequestParser.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

const std::string post = "POST /a HTTP/1.1\r\nHost: h\r\n";

/// The request with this head; the same when it arrives byte by byte.
IncomingRequest read(const std::string& head) {
    const std::string bytes = head + "\r\n\r\n";
    RequestParser whole;
    whole.put(bytes);
    EXPECT_TRUE(whole.isHeadDone()) << head;
    IncomingRequest incoming = whole.takeHead();
    RequestParser slow;
    std::string waiting;
    for (std::size_t at = 0; at < bytes.size() && !slow.isHeadDone(); ++at) {
        waiting += bytes[at];
        waiting.erase(0, slow.put(waiting));
    }
    EXPECT_TRUE(slow.isHeadDone()) << head;
    const IncomingRequest same = slow.takeHead();
    EXPECT_EQ(same.refusal.has_value(), incoming.refusal.has_value()) << head;
    EXPECT_EQ(same.request.path, incoming.request.path);
    EXPECT_EQ(same.length, incoming.length);
    return incoming;
}

int statusOf(const std::string& head) {
    const IncomingRequest incoming = read(head);
    return incoming.refusal ? incoming.refusal->status : 200;
}

TEST(RequestParserTest, ParsesARequest) {
    const IncomingRequest incoming =
        read("GET /a/b%20c?x=1&y=%2F#end HTTP/1.1\r\nhost:h:1\r\nORIGIN: http://h:1\r\n"
             "Authorization: \t Bearer a%41+b \t\r\nAccept: text/html\r\n"
             "Last-Event-ID: 7\r\nX-Empty:\r\nX-Twice: 1\r\nX-Twice: 2");
    EXPECT_FALSE(incoming.refusal);
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

TEST(RequestParserTest, TheHostMayBeInTheTarget) {
    const IncomingRequest whole = read("GET HTTP://localhost:7186/a?b HTTP/1.1\r\nHost: other");
    EXPECT_EQ(whole.headers.host, "localhost:7186");
    EXPECT_EQ(whole.request.path, "/a");
    EXPECT_EQ(whole.rawQuery, "b");
    const IncomingRequest bare = read("GET https://evil?/healthz HTTP/1.1\r\nHost: h");
    EXPECT_EQ(bare.headers.host, "evil");
    EXPECT_EQ(bare.request.path, "");
    EXPECT_EQ(bare.rawQuery, "/healthz");
}

TEST(RequestParserTest, ABodyHasALengthOrIsChunked) {
    const IncomingRequest withLength = read(post + "Content-Length: 12");
    EXPECT_TRUE(withLength.hasBody);
    EXPECT_EQ(withLength.length, 12u);
    EXPECT_FALSE(withLength.isChunked || withLength.isLast);
    const IncomingRequest empty = read(post + "Content-Length: 0");
    EXPECT_FALSE(empty.hasBody || empty.refusal);
    const IncomingRequest chunked = read(post + "Transfer-Encoding: chunked");
    EXPECT_TRUE(chunked.hasBody && chunked.isChunked);
    EXPECT_TRUE(chunked.isLast) << "nothing after chunks is read as a request";
}

TEST(RequestParserTest, AmbiguousRequestsAreRefused) {
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
                                   "Transfer-Encoding: chunked\r\nContent-Length: 2",
                                   "Content-Length: 2\r\nContent-Length: 3",
                                   "Transfer-Encoding: chunke%64",
                                   "Transfer-Encoding: Chunked",
                                   "Transfer-Encoding: gzip, chunked",
                                   "Transfer-Encoding:",
                                   "Transfer-Encoding: \vchunked",
                                   "Transfer-Encoding:\r\n chunked",
                                   "Transfer-Encoding: chunked\r\nTransfer-Encoding: chunked",
                                   "X: y\r\n z: w",
                                   "X: y\r\n\tz",
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
    EXPECT_EQ(statusOf(post + "X: \ta\t\xc3\xa9"), 200) << "tabs and other bytes are harmless";
    for (const char* const name :
         {"host", "Origin", "Authorization", "Content-Type", "Last-Event-ID"}) {
        const IncomingRequest twice =
            read(std::string("GET / HTTP/1.1\r\n") + name + ": 1\r\n" + name + ": 1");
        ASSERT_TRUE(twice.refusal) << name;
        EXPECT_EQ(twice.refusal->problem.what, "the header appears more than once");
    }
}

TEST(RequestParserTest, InvalidRequestLinesAreRefused) {
    for (const char* const line :
         {"", "GET", "GET /", "GET  / HTTP/1.1", "GET / HTTP/1.1 ", "GET / HTTP/1.2",
          "GET / http/1.1", "get / HTTP/1.1", "BREW / HTTP/1.1", " GET / HTTP/1.1",
          "GET /\x1b HTTP/1.1", "GET /\t HTTP/1.1", "PRI * HTTP/2.0"}) {
        EXPECT_EQ(statusOf(line), 400) << line;
    }
    const IncomingRequest brewing = read("BREW / HTTP/1.1");
    EXPECT_EQ(brewing.request.method, "") << "only known methods appear in the statistics";
}

TEST(RequestParserTest, LongTargetsAndHeadersAreRefused) {
    const std::string most(RequestParser::largestTarget - 1, 'x');
    EXPECT_EQ(statusOf("GET /" + most + " HTTP/1.1"), 200);
    EXPECT_EQ(statusOf("GET /" + most + "x HTTP/1.1"), 414);
    const std::string line = "X:" + std::string(RequestParser::largestLine - 2, 'x');
    EXPECT_EQ(statusOf(post + line), 200);
    EXPECT_EQ(statusOf(post + line + "x"), 431);
}

TEST(RequestParserTest, LimitsHeads) {
    const std::string begin = "GET / HTTP/1.1\r\n";
    std::string head = begin;
    while (head.size() + 7010 < RequestParser::largestHead) {
        head += "X: " + std::string(7000, 'x') + "\r\n";
    }
    head += "X: ";
    EXPECT_EQ(statusOf(head + std::string(RequestParser::largestHead - head.size(), 'x')), 200);
    EXPECT_EQ(statusOf(head + std::string(RequestParser::largestHead - head.size() + 1, 'x')), 431);
    RequestParser endless;
    endless.put(begin + "X: " + std::string(RequestParser::largestHead, 'x'));
    ASSERT_TRUE(endless.isHeadDone()) << "it does not wait for the end";
    EXPECT_EQ(endless.takeHead().refusal->status, 431);
    RequestParser target;
    target.put("GET /" + std::string(RequestParser::largestHead, 'x'));
    EXPECT_EQ(target.takeHead().refusal->status, 431);
    EXPECT_EQ(statusOf(post + "Range: bytes=" + std::string(9000, '1')), 200) << "nothing uses it";
}

TEST(RequestParserTest, ChunksNeedHttp11) {
    EXPECT_EQ(statusOf("POST / HTTP/1.0\r\nHost: h\r\nTransfer-Encoding: chunked"), 400);
}

/// The result of a body that arrives in two parts.
struct Body {
    std::string text;
    std::string rest; ///< what follows the request
    int status = 200;
    bool isDone = false;
};

Body readBody(const std::string& header, std::string bytes, std::size_t most = 1000) {
    RequestParser parser;
    const std::string head = post + header + "\r\n\r\n";
    EXPECT_EQ(parser.put(head + bytes), head.size());
    parser.limitBody(most);
    std::string waiting;
    for (const char c : bytes) {
        waiting += c;
        for (std::size_t count = 1; count > 0;) {
            count = parser.put(waiting);
            waiting.erase(0, count);
        }
    }
    Body body;
    body.status = parser.bodyRefusal() ? parser.bodyRefusal()->status : 200;
    body.isDone = parser.isDone();
    body.rest = waiting;
    body.text = body.isDone ? parser.takeBody() : "";
    return body;
}

TEST(RequestParserTest, ReadsBodiesToTheirEnd) {
    const Body plain = readBody("Content-Length: 4", "bodyGET / HTTP/1.1");
    EXPECT_EQ(plain.text, "body");
    EXPECT_EQ(plain.rest, "GET / HTTP/1.1");
    EXPECT_FALSE(readBody("Content-Length: 4", "bod").isDone);
    const Body chunks =
        readBody("Transfer-Encoding: chunked", "2\r\nbo\r\n2;a=b\r\ndy\r\n0\r\n\r\nX");
    EXPECT_EQ(chunks.text, "body");
    EXPECT_EQ(chunks.rest, "X");
}

TEST(RequestParserTest, RefusesChunksThatAreAmbiguousOrTooLong) {
    for (const char* const chunks :
         {"zz\r\n", "0x2\r\nbo", "-1\r\n", "2\nbo\n", "2\r\nbody", " 2\r\nbo", "2 \r\nbo\r\n",
          "2;=\r\n", "2\r\nbo\r\n0\r\nX: y\nz\r\n\r\n", "0\r\nContent-Length: 7\r\n\r\n"}) {
        const std::string whole = std::string(chunks) + "\r\n0\r\n\r\n";
        EXPECT_EQ(readBody("Transfer-Encoding: chunked", whole).status, 400) << chunks;
    }
    EXPECT_EQ(readBody("Transfer-Encoding: chunked", "3\r\nbod\r\n3\r\n", 5).status, 413);
    EXPECT_EQ(readBody("Transfer-Encoding: chunked", "ffffffffffffffff\r\n").status, 413);
    EXPECT_NE(readBody("Transfer-Encoding: chunked", "fffffffffffffffff\r\n").status, 200);
}

TEST(RequestParserTest, TheClientDecidesWhetherItsConnectionIsKept) {
    const auto isLast = [](const std::string& head) { return read(head).isLast; };
    EXPECT_FALSE(isLast(post + "Connection: keep-alive"));
    EXPECT_TRUE(isLast(post + "Connection: close"));
    EXPECT_TRUE(isLast(post + "Connection: x, Close ,y"));
    EXPECT_TRUE(isLast(post + "Connection: x\r\nConnection: CLOSE"));
    EXPECT_FALSE(isLast(post + "Connection: closed"));
    EXPECT_TRUE(isLast("GET / HTTP/1.0\r\nHost: h"));
    EXPECT_FALSE(isLast("GET / HTTP/1.0\r\nHost: h\r\nConnection: Keep-Alive"));
}

} // namespace
