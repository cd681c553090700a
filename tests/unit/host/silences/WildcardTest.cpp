#include "host/silences/Wildcard.h"

#include <gtest/gtest.h>

#include <random>
#include <string>

using namespace zrm::host;

namespace {

bool matches(const std::string& pattern, const std::string& text) {
    return Wildcard(pattern).matches(text);
}

bool matchesPath(const std::string& pattern, const std::string& path) {
    return Wildcard(pattern, Wildcard::Kind::PATH).matches(path);
}

TEST(Wildcard, MatchesWholeTexts) {
    EXPECT_TRUE(matches("", ""));
    EXPECT_TRUE(matches("disk", "disk"));
    EXPECT_FALSE(matches("disk", "disks"));
    EXPECT_FALSE(matches("disk", "Disk"));
    EXPECT_TRUE(matches("*", ""));
    EXPECT_TRUE(matches("d*k", "dk"));
    EXPECT_TRUE(matches("d*s*k", "dusk at disk"));
    EXPECT_FALSE(matches("d*s*k", "dusk at disko"));
    EXPECT_TRUE(matches("*ab", "aab"));
    EXPECT_FALSE(matches("?", ""));
    EXPECT_TRUE(matches("d?sk", "d\xC3\xBCsk")) << "one character of two bytes";
    EXPECT_FALSE(matches("d??sk", "d\xC3\xBCsk"));
    EXPECT_FALSE(matches("*??sk", "\xC3\xBCsk"));
}

TEST(Wildcard, ABackslashTakesTheNextCharacterLiterally) {
    EXPECT_TRUE(matches(R"(a\*b)", "a*b"));
    EXPECT_FALSE(matches(R"(a\*b)", "aab"));
    EXPECT_TRUE(matches(R"(\?)", "?"));
    EXPECT_FALSE(matches(R"(\?)", "a"));
    EXPECT_TRUE(matches(R"(a\\)", R"(a\)"));
    EXPECT_TRUE(matches(R"(a\)", R"(a\)")) << "at the end it stands for itself";
    EXPECT_TRUE(matches("[a]", "[a]")) << "brackets are characters";
}

TEST(Wildcard, KnowsWhetherItIsAPattern) {
    EXPECT_FALSE(Wildcard("disk").isPattern());
    EXPECT_FALSE(Wildcard(R"(disk\*)").isPattern());
    EXPECT_TRUE(Wildcard("disk*").isPattern());
    EXPECT_TRUE(Wildcard(R"(\\?)").isPattern());
}

TEST(Wildcard, StopsAtSlashesInPaths) {
    EXPECT_TRUE(matchesPath("/var/log/*.log", "/var/log/app.log"));
    EXPECT_FALSE(matchesPath("/var/log/*.log", "/var/log/nginx/app.log"));
    EXPECT_TRUE(matchesPath("/var/*/*.log", "/var/log/app.log"));
    EXPECT_FALSE(matchesPath("/var/*.log", "/var/log/app.log"));
    EXPECT_FALSE(matchesPath("/var?log", "/var/log"));
    EXPECT_TRUE(matches("/var?log*", "/var/log/app.log"));
    EXPECT_TRUE(matchesPath("/*a/b", "/aaa/b"));
    EXPECT_FALSE(matchesPath("/*a/b", "/a/aaa/b"));
}

TEST(Wildcard, ManyStarsTakeNoLongerThanTheProductOfBothLengths) {
    std::string pattern;
    for (int star = 0; star < 500; ++star) {
        pattern += "*a";
    }
    EXPECT_FALSE(matches(pattern + "b", std::string(100'000, 'a')));
    EXPECT_TRUE(matches(pattern + "*", std::string(100'000, 'a')));
}

/// What a pattern means, by trying every way.
bool matchesByDefinition(std::string_view pattern, std::string_view text, bool isPath) {
    if (pattern.empty()) {
        return text.empty();
    }
    if (pattern.front() == '*') {
        for (std::size_t taken = 0; taken <= text.size(); ++taken) {
            if (matchesByDefinition(pattern.substr(1), text.substr(taken), isPath)) {
                return true;
            }
            if (isPath && taken < text.size() && text[taken] == '/') {
                return false;
            }
        }
        return false;
    }
    const bool isFirst =
        !text.empty() &&
        (pattern.front() == '?' ? !isPath || text.front() != '/' : pattern.front() == text.front());
    return isFirst && matchesByDefinition(pattern.substr(1), text.substr(1), isPath);
}

TEST(Wildcard, MatchesAsDefined) {
    std::mt19937 random(20'261'122);
    const auto text = [&](std::string_view letters, std::size_t most) {
        std::string result(random() % (most + 1), ' ');
        for (char& letter : result) {
            letter = letters[random() % letters.size()];
        }
        return result;
    };
    int matched = 0;
    for (int round = 0; round < 200'000; ++round) {
        const std::string pattern = text("ab/*?", 7);
        const std::string subject = text("ab/", 9);
        const bool isPath = round % 2 == 0;
        const bool expected = matchesByDefinition(pattern, subject, isPath);
        const auto kind = isPath ? Wildcard::Kind::PATH : Wildcard::Kind::TEXT;
        ASSERT_EQ(Wildcard(pattern, kind).matches(subject), expected)
            << pattern << ' ' << subject << ' ' << isPath;
        matched += expected ? 1 : 0;
    }
    EXPECT_GT(matched, 1000);
}

} // namespace
