#include "framework/LinkedList.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <utility>
#include <vector>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

std::vector<void*> walk(LinkedList& list) {
    std::vector<void*> result;
    LinkedListIter iterator(list);
    while (void* const element = iterator.Next()) {
        result.push_back(element);
    }
    EXPECT_EQ(iterator.Next(), nullptr) << "it stays at the end";
    return result;
}

TEST(LinkedList, IsWalkedInTheOrderOfAddition) {
    int a, b, c;
    LinkedList list;
    EXPECT_THAT(walk(list), IsEmpty());
    list.Add(&a);
    list.Add(&b);
    list.Add(&c);
    EXPECT_THAT(walk(list), ElementsAre(&a, &b, &c));
}

TEST(LinkedList, RemovesTheFirstOccurrenceOnly) {
    int a, b, unknown;
    LinkedList list;
    list.Add(&a);
    list.Add(&b);
    list.Add(&a);
    list.Remove(&a);
    EXPECT_THAT(walk(list), ElementsAre(&b, &a));
    list.Remove(&unknown);
    EXPECT_THAT(walk(list), ElementsAre(&b, &a));
}

TEST(LinkedList, KnowsItsLastElement) {
    int a, b;
    LinkedList list;
    EXPECT_EQ(list.Last(), nullptr);
    list.Add(&a);
    list.Add(&b);
    EXPECT_EQ(list.Last(), &b);
    list.Clear();
    EXPECT_EQ(list.Last(), nullptr);
    EXPECT_THAT(walk(list), IsEmpty());
}

TEST(LinkedList, HasANewGenerationAfterEachChange) {
    int a, unknown;
    LinkedList list;
    std::uint64_t before = 0;
    const auto hasChanged = [&] { return std::exchange(before, list.generation()) != before; };
    EXPECT_TRUE(hasChanged());
    list.Add(&a);
    EXPECT_TRUE(hasChanged());
    list.Remove(&unknown);
    EXPECT_FALSE(hasChanged());
    list.Remove(&a);
    EXPECT_TRUE(hasChanged());
    list.Clear();
    EXPECT_TRUE(hasChanged());
}

} // namespace
