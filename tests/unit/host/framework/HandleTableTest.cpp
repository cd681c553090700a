#include "host/framework/HandleTable.h"

#include "framework/ctreq.h"
#include "framework/values.h"
#include "support/Faults.h"
#include "unit/host/framework/TestTable.h"

#include <gtest/gtest.h>

#include <atomic>
#include <memory>
#include <set>
#include <thread>
#include <vector>

using namespace zrm::host;

namespace {

/// The table only returns the address, so any address will do.
ctreq* address(int& object) {
    return reinterpret_cast<ctreq*>(&object);
}

TEST(HandleTable, FindsTheRequestOfAHandle) {
    int first, second;
    const unsigned one = HandleTable::open(address(first));
    const unsigned two = HandleTable::open(address(second));
    EXPECT_NE(one, 0u);
    EXPECT_NE(one, two);
    EXPECT_EQ(ctreq::UseHandle(one), address(first));
    EXPECT_EQ(ctreq::UseHandle(two), address(second));
    RSC1_Drop(one);
    RSC1_Drop(two);
    HandleTable::close(one);
    EXPECT_EQ(ctreq::UseHandle(one), nullptr);
    EXPECT_EQ(HandleTable::pin(two), address(second));
    HandleTable::unpin(two);
    HandleTable::close(two);
}

TEST(HandleTable, UnknownHandlesFindNothing) {
    EXPECT_EQ(HandleTable::pin(0), nullptr);
    EXPECT_EQ(HandleTable::pin(0xffffffff), nullptr);
    EXPECT_EQ(HandleTable::pin(0x7fff0001), nullptr);
    HandleTable::unpin(0);
    HandleTable::unpin(0xffffffff);
    HandleTable::close(0);
    HandleTable::close(0xffffffff);
}

TEST(HandleTable, ADropWithoutAPinChangesNothing) {
    int object;
    const unsigned handle = HandleTable::open(address(object));
    HandleTable::unpin(handle);
    EXPECT_EQ(HandleTable::pin(handle), address(object));
    HandleTable::unpin(handle);
    HandleTable::close(handle);
    HandleTable::unpin(handle);
    HandleTable::close(handle);
}

TEST(HandleTable, DoesNotReuseAHandleSoon) {
    int object;
    std::set<unsigned> given;
    for (int round = 0; round < 100000; ++round) {
        const unsigned handle = HandleTable::open(address(object));
        ASSERT_TRUE(given.insert(handle).second) << "after " << round;
        HandleTable::close(handle);
        ASSERT_EQ(HandleTable::pin(handle), nullptr);
    }
}

TEST(HandleTable, ServesManyAtOnceAndRefusesMore) {
    int object;
    std::vector<unsigned> handles;
    while (const unsigned handle = HandleTable::open(address(object))) {
        handles.push_back(handle);
        ASSERT_LE(handles.size(), 65536u);
    }
    EXPECT_EQ(handles.size(), 65536u);
    EXPECT_EQ(std::set<unsigned>(handles.begin(), handles.end()).size(), handles.size());
    EXPECT_EQ(HandleTable::pin(handles[40000]), address(object));
    HandleTable::unpin(handles[40000]);
    for (const unsigned handle : handles) {
        HandleTable::close(handle);
    }
    const unsigned again = HandleTable::open(address(object));
    EXPECT_NE(again, 0u);
    HandleTable::close(again);
}

TEST(HandleTable, CloseWaitsForTheLastPin) {
    int object;
    const unsigned handle = HandleTable::open(address(object));
    HandleTable::pin(handle);
    HandleTable::pin(handle);
    std::atomic<bool> closed{false};
    std::thread closer([&] {
        HandleTable::close(handle);
        closed = true;
    });
    // Once it is closing, no more pins are given.
    while (HandleTable::pin(handle) != nullptr) {
        HandleTable::unpin(handle);
        std::this_thread::yield();
    }
    HandleTable::unpin(handle);
    EXPECT_FALSE(closed) << "one pin is left";
    HandleTable::unpin(handle);
    closer.join();
    EXPECT_TRUE(closed);
}

TEST(HandleTable, AnObjectIsIntactWhileItIsPinned) {
    struct Watched {
        std::atomic<int> alive{1};
    };
    std::atomic<unsigned> current{0};
    std::atomic<bool> done{false};
    std::atomic<int> used{0};
    std::vector<std::thread> users;
    for (int i = 0; i < 3; ++i) {
        users.emplace_back([&] {
            while (!done) {
                const unsigned handle = current;
                if (auto* const object = reinterpret_cast<Watched*>(HandleTable::pin(handle))) {
                    ASSERT_EQ(object->alive.load(), 1);
                    ++used;
                    HandleTable::unpin(handle);
                }
            }
        });
    }
    int rounds = 0;
    while (rounds < 2000 || used < 1000) {
        auto* const object = new Watched;
        const unsigned handle = HandleTable::open(reinterpret_cast<ctreq*>(object));
        current = handle;
        if (++rounds % 16 == 0) {
            std::this_thread::yield();
        }
        HandleTable::close(handle);
        object->alive = 0;
        delete object;
    }
    done = true;
    for (std::thread& user : users) {
        user.join();
    }
}

} // namespace
