#include "kzsdk/jni/registry.hpp"

#include <atomic>
#include <limits>
#include <set>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "waits.hpp"

namespace {

using kz::jni::Registered;
using kz::jni::Registry;

TEST(Registry, FindsAnObjectByItsNumber)
{
    Registry registry;
    Registered one;
    Registered two;
    const int32_t first = registry.add(one);
    const int32_t second = registry.add(two);
    EXPECT_NE(first, second);
    EXPECT_EQ(&one, registry.pin(first));
    EXPECT_EQ(&two, registry.pin(second));
    registry.unpin(one);
    registry.unpin(two);
}

TEST(Registry, FindsNothingByAnUnknownNumber)
{
    Registry registry;
    Registered object;
    const int32_t number = registry.add(object);
    for (const int32_t other : {0, number + 1, -number, std::numeric_limits<int32_t>::min()}) {
        EXPECT_EQ(nullptr, registry.pin(other));
        EXPECT_EQ(nullptr, registry.claim(other));
    }
}

TEST(Registry, FindsNothingByAStaleNumber)
{
    Registry registry;
    Registered object;
    const int32_t stale = registry.add(object);
    EXPECT_EQ(&object, registry.claim(stale));
    registry.remove(object);
    EXPECT_EQ(nullptr, registry.pin(stale));
    EXPECT_EQ(nullptr, registry.claim(stale));
}

TEST(Registry, LetsOneOfTwoClaimAnObjectThatOthersStillFind)
{
    Registry registry;
    Registered object;
    const int32_t number = registry.add(object);
    EXPECT_EQ(&object, registry.claim(number));
    EXPECT_EQ(nullptr, registry.claim(number));
    EXPECT_EQ(&object, registry.pin(number));
    registry.unpin(object);
    registry.remove(object);
}

TEST(Registry, GivesNoNumberTwice)
{
    Registry registry;
    std::set<int32_t> given;
    for (int i = 0; i < 100000; ++i) {
        Registered object;
        const int32_t number = registry.add(object);
        EXPECT_TRUE(given.insert(number).second);
        registry.claim(number);
        registry.remove(object);
    }
    EXPECT_FALSE(given.contains(0));
}

TEST(Registry, StepsOverZeroAndNumbersInUseWhenItWraps)
{
    Registry registry(-2);
    Registered one;
    EXPECT_EQ(-1, registry.add(one));
    Registered two;
    EXPECT_EQ(1, registry.add(two));

    Registry wrapping(std::numeric_limits<int32_t>::max());
    Registered three;
    EXPECT_EQ(std::numeric_limits<int32_t>::min(), wrapping.add(three));

    Registry full(0);
    Registered four;
    Registered five;
    EXPECT_EQ(1, full.add(four));
    four.number = 2; // as if it had lived through a whole round
    EXPECT_EQ(3, full.add(five));
}

TEST(Registry, RemovesFromAnywhereInTheList)
{
    Registry registry;
    std::vector<Registered> objects(5);
    std::vector<int32_t> numbers;
    for (auto& object : objects) {
        numbers.push_back(registry.add(object));
    }
    for (const size_t index : {2U, 4U, 0U, 1U, 3U}) {
        EXPECT_EQ(&objects[index], registry.claim(numbers[index]));
        registry.remove(objects[index]);
        EXPECT_EQ(nullptr, registry.pin(numbers[index]));
    }
}

TEST(Registry, RemovesNothingThatIsPinned)
{
    Registry registry;
    Registered object;
    const int32_t number = registry.add(object);
    registry.pin(number);
    registry.pin(number);
    std::atomic<bool> removed{false};
    const uint64_t before = kz::test::waits_begun();
    std::thread remover([&] {
        EXPECT_EQ(&object, registry.claim(number));
        registry.remove(object);
        removed = true;
    });
    kz::test::until_waits_have_begun(before + 1);
    EXPECT_EQ(nullptr, registry.pin(number)) << "nobody finds what is being removed";
    registry.unpin(object);
    kz::test::wake_without_reason();
    EXPECT_FALSE(removed);
    registry.unpin(object);
    remover.join();
}

TEST(Registry, ServesManyThreads)
{
    Registry registry;
    std::atomic<int32_t> current{0};
    std::atomic<bool> done{false};
    std::vector<std::thread> users;
    for (int i = 0; i < 3; ++i) {
        users.emplace_back([&] {
            while (!done) {
                if (Registered* const object = registry.pin(current)) {
                    registry.unpin(*object);
                }
            }
        });
    }
    for (int i = 0; i < 2000; ++i) {
        Registered object; // gone at the end of this turn
        current = registry.add(object);
        EXPECT_EQ(&object, registry.claim(current));
        EXPECT_EQ(nullptr, registry.claim(current));
        registry.remove(object);
    }
    done = true;
    for (auto& user : users) {
        user.join();
    }
}

} // namespace
