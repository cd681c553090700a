#include "host/base/ListenAddress.h"

#include <gtest/gtest.h>

using namespace zrm::host;

namespace {

TEST(ListenAddress, ReadsHostAndPort) {
    EXPECT_EQ(ListenAddress::parse("127.0.0.1:7186"), (ListenAddress{"127.0.0.1", 7186}));
    EXPECT_EQ(ListenAddress::parse("localhost:0"), (ListenAddress{"localhost", 0}));
    EXPECT_EQ(ListenAddress::parse("[::1]:65535"), (ListenAddress{"::1", 65535}));
}

TEST(ListenAddress, RefusesEverythingElse) {
    for (const char* const text :
         {"", ":", "7186", "127.0.0.1", "127.0.0.1:", ":7186", "::1:7186", "[::1]", "[]:1",
          "127.0.0.1:65536", "127.0.0.1:-1", "127.0.0.1:+1", "127.0.0.1:80x", "local host:80",
          "http://localhost:80", "a/b:80", "[::1:80"}) {
        EXPECT_FALSE(ListenAddress::parse(text)) << text;
    }
}

TEST(ListenAddress, KnowsLoopbackAddresses) {
    for (const char* const host : {"127.0.0.1", "127.1.2.3", "::1", "localhost"}) {
        EXPECT_TRUE((ListenAddress{host, 1}.isLoopback())) << host;
    }
    for (const char* const host :
         {"0.0.0.0", "::", "128.0.0.1", "fe80::1", "web1", "127.0.0.1.example.org",
          "localhost.example.org", "::ffff:127.0.0.1"}) {
        EXPECT_FALSE((ListenAddress{host, 1}.isLoopback())) << host;
    }
}

TEST(ListenAddress, IsWrittenAsInAUrl) {
    EXPECT_EQ((ListenAddress{"127.0.0.1", 80}.text()), "127.0.0.1:80");
    EXPECT_EQ((ListenAddress{"::1", 80}.text()), "[::1]:80");
}

} // namespace
