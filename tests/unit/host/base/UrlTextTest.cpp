#include "host/base/UrlText.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <string>

using namespace zrm::host;

namespace {

using Query = std::multimap<std::string, std::string>;

TEST(UrlText, DecodesPercentEncoding) {
    EXPECT_EQ(UrlText::decode(""), "");
    EXPECT_EQ(UrlText::decode("a+b"), "a+b");
    EXPECT_EQ(UrlText::decode("%2Fvar%2flog%20%25"), "/var/log %");
    EXPECT_EQ(UrlText::decode("%C3%A4%e2%82%ac"), "\xc3\xa4\xe2\x82\xac");
}

TEST(UrlText, RefusesWhatIsNotText) {
    for (const char* const broken :
         {"%", "a%", "%2", "%2x", "%x2", "%-1", "%+1", "% 1", "%00", "%ff", "%C3", "%ED%A0%80"}) {
        EXPECT_EQ(UrlText::decode(broken), std::nullopt) << broken;
    }
}

TEST(UrlText, EncodesWhateverHasAMeaningInAUrl) {
    EXPECT_EQ(UrlText::encode(""), "");
    EXPECT_EQ(UrlText::encode("ssh-brute_force.1~"), "ssh-brute_force.1~");
    EXPECT_EQ(UrlText::encode("a/b c?d%&\xC3\xA4"), "a%2Fb%20c%3Fd%25%26%C3%A4");
}

TEST(UrlText, DecodesWhatItEncodes) {
    std::string text;
    for (char c = 1; c != '\x7f'; ++c) {
        text += c;
    }
    EXPECT_EQ(UrlText::decode(UrlText::encode(text)), text);
}

TEST(UrlText, ReadsQueries) {
    EXPECT_EQ(UrlText::query(""), Query());
    EXPECT_EQ(UrlText::query("a=1&b=x+y%2B&a=2"), (Query{{"a", "1"}, {"a", "2"}, {"b", "x y+"}}));
    EXPECT_EQ(UrlText::query("a&=b&c=&&d=e=f"),
              (Query{{"a", ""}, {"", "b"}, {"c", ""}, {"d", "e=f"}}));
    EXPECT_EQ(UrlText::query("a=%26&%3D=1"), (Query{{"=", "1"}, {"a", "&"}}));
    EXPECT_EQ(UrlText::query("a=%"), std::nullopt);
    EXPECT_EQ(UrlText::query("%ff=1"), std::nullopt);
}

} // namespace
