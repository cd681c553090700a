#include "monitor/LineShapes.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <random>
#include <string>
#include <utility>
#include <vector>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Pair;

std::vector<std::pair<std::string, std::int64_t>> shapesOf(const LineShapes& shapes) {
    LineShapes::Shape kept[LineShapes::mostKept];
    std::vector<std::pair<std::string, std::int64_t>> all;
    const std::size_t count = shapes.copy(kept);
    for (std::size_t i = 0; i < count; ++i) {
        all.emplace_back(kept[i].view(), kept[i].count);
    }
    return all;
}

TEST(LineShapes, LinesThatDifferInWordsAndNumbersHaveOneShape) {
    LineShapes shapes;
    EXPECT_THAT(shapesOf(shapes), IsEmpty());
    shapes.note("[17] user anna: port=8080");
    shapes.note("[4] wer  b\xc3\xa4r:\tport=1");
    shapes.note("# comment");
    shapes.note("");
    EXPECT_THAT(shapesOf(shapes), testing::UnorderedElementsAre(Pair("[9] a a: a=9", 2),
                                                                Pair("# a", 1), Pair("", 1)));
    EXPECT_EQ(shapesOf(shapes).front().first, "[9] a a: a=9");
}

TEST(LineShapes, AShapeHasABound) {
    LineShapes shapes;
    shapes.note(std::string(1000, '-') + "x");
    shapes.note(std::string(1000, '-') + "9");
    shapes.note(std::string(1000000, 'x'));
    EXPECT_THAT(shapesOf(shapes),
                ElementsAre(Pair(std::string(LineShapes::longest, '-'), 2), Pair("a", 1)));
}

/// Of many shapes the frequent ones are kept, and none is counted too often.
TEST(LineShapes, KeepsTheFrequentOnesOfAnyNumber) {
    const unsigned seed = std::random_device()();
    std::mt19937 random(seed);
    LineShapes shapes;
    std::map<std::string, std::int64_t> model;
    for (int i = 0; i < 20000; ++i) {
        const std::string line =
            random() % 3 != 0
                ? std::string("frequent ") + (i % 2 != 0 ? "!" : "?")
                : std::string(1 + random() % 70, '#') + std::string(random() % 2, '+');
        shapes.note(line);
        ++model[line.starts_with('f') ? "a " + line.substr(9) : line];
    }
    const auto kept = shapesOf(shapes);
    ASSERT_EQ(kept.size(), LineShapes::mostKept);
    EXPECT_THAT((std::vector<std::string>{kept[0].first, kept[1].first}),
                testing::UnorderedElementsAre("a !", "a ?"))
        << "seed " << seed;
    for (const auto& [shape, count] : kept) {
        EXPECT_LE(count, model[shape]) << shape << ", seed " << seed;
        EXPECT_GE(count, 1) << shape << ", seed " << seed;
    }
}

} // namespace
