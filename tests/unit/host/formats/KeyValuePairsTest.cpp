#include "host/formats/KeyValuePairs.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>
#include <string>
#include <utility>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;
using testing::SizeIs;

std::vector<std::pair<std::string, std::string>> fieldsOf(std::string_view text) {
    EntryFields fields;
    KeyValuePairs::addTo(fields, text);
    std::vector<std::pair<std::string, std::string>> pairs;
    for (const EntryFields::Field& field : fields.all()) {
        pairs.emplace_back(field.name, field.value);
    }
    return pairs;
}

TEST(KeyValuePairs, FindsPairsBetweenOtherWords) {
    EXPECT_THAT(
        fieldsOf("listening address=127.0.0.1:80 on tls.mode=strict, n=3;"),
        ElementsAre(Pair("address", "127.0.0.1:80"), Pair("tls.mode", "strict"), Pair("n", "3")));
    EXPECT_THAT(fieldsOf("a=b=c d= e"), ElementsAre(Pair("a", "b=c"), Pair("d", "")));
    EXPECT_THAT(fieldsOf("stopped|10|src=10.0.0.1 act=blocked"),
                ElementsAre(Pair("src", "10.0.0.1"), Pair("act", "blocked")));
    EXPECT_THAT(fieldsOf(""), IsEmpty());
    EXPECT_THAT(fieldsOf("= =a x =b \xff=c [k=v]"), IsEmpty());
}

TEST(KeyValuePairs, ResolvesEscapesOnlyWithinQuotes) {
    EXPECT_THAT(fieldsOf(R"(a="x \"y\" \\ \n\t" b=C:\new c="\q")"),
                ElementsAre(Pair("a", "x \"y\" \\ \n\t"), Pair("b", "C:\\new"), Pair("c", "\\q")));
    EXPECT_THAT(fieldsOf(R"(a="not closed b=1)"), ElementsAre(Pair("a", "\"not"), Pair("b", "1")));
    EXPECT_THAT(fieldsOf("a=\"ends with \\"), SizeIs(1));
}

TEST(KeyValuePairs, FindsThoseWithinSingleQuotes) {
    EXPECT_THAT(fieldsOf("pid=1 msg='op=login acct=\"root\" res=failed' end=1"),
                ElementsAre(Pair("pid", "1"), Pair("msg", "op=login acct=\"root\" res=failed"),
                            Pair("op", "login"), Pair("acct", "root"), Pair("res", "failed"),
                            Pair("end", "1")));
    EXPECT_THAT(fieldsOf("a=1\x1d"
                         "B=2"),
                ElementsAre(Pair("a", "1"), Pair("B", "2")));
}

TEST(KeyValuePairs, KeysHaveABound) {
    EXPECT_THAT(fieldsOf(std::string(255, 'k') + "=v"), SizeIs(1));
    EXPECT_THAT(fieldsOf(std::string(256, 'k') + "=v"), IsEmpty());
}

/// Whatever the text is, keys and values lie within it, in its order.
TEST(KeyValuePairs, StaysWithinTheTextWhateverItIs) {
    const unsigned seed = std::random_device()();
    std::mt19937 random(seed);
    constexpr std::string_view bytes = "ab=\"'\\ =,;\n\x1d\xff.";
    for (int round = 0; round < 20000; ++round) {
        std::string text(random() % 40, ' ');
        for (char& c : text) {
            c = bytes[random() % bytes.size()];
        }
        KeyValuePairs pairs(text);
        const char* last = text.data();
        for (KeyValuePairs::Pair pair; pairs.next(pair);) {
            ASSERT_GE(pair.key.data(), last) << "seed " << seed;
            ASSERT_LE(pair.value.data() + pair.value.size(), text.data() + text.size())
                << "seed " << seed;
            ASSERT_FALSE(pair.key.empty());
            last = pair.key.data() + pair.key.size();
        }
        fieldsOf(text);
    }
}

} // namespace
