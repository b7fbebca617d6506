#include "budget.h"

#include <gtest/gtest.h>

#include <thread>
#include <utility>
#include <vector>

namespace vorn::server {
namespace {

TEST(Budget, IsTakenAndReturned) {
  Budget budget(100, 100);
  {
    const auto first = budget.Take("", 60);
    ASSERT_TRUE(first);
    EXPECT_EQ(budget.used(), 60U);
    EXPECT_FALSE(budget.Take("", 41));
    EXPECT_TRUE(budget.Take("", 40));
  }
  EXPECT_EQ(budget.used(), 0U);
}

TEST(Budget, OnePeerHasAShare) {
  Budget budget(100, 30);
  auto held = budget.Take("a", 20);
  EXPECT_FALSE(budget.Take("a", 11));
  EXPECT_TRUE(budget.Take("b", 30));
  EXPECT_TRUE(budget.Take("", 50));
  held.reset();
  EXPECT_TRUE(budget.Take("a", 30));
  EXPECT_FALSE(budget.Take("c", 31)) << "more than a share, although nothing is used";
}

TEST(Budget, SaysWhetherAnAmountCouldEverBeTaken) {
  Budget budget(100, 30);
  const auto held = budget.Take("", 100);
  EXPECT_TRUE(budget.HasRoomFor("", 100));
  EXPECT_FALSE(budget.HasRoomFor("", 101));
  EXPECT_TRUE(budget.HasRoomFor("a", 30));
  EXPECT_FALSE(budget.HasRoomFor("a", 31));
}

TEST(Budget, AChargeIsReturnedOnceAfterItWasMoved) {
  Budget budget(100, 100);
  auto first = budget.Take("a", 40);
  {
    const Charge moved = *std::move(first);
    first.reset();
    EXPECT_EQ(budget.used(), 40U);
    EXPECT_EQ(moved.amount(), 40U);
  }
  EXPECT_EQ(budget.used(), 0U);
}

TEST(Budget, HoldsAmongThreads) {
  Budget budget(100, 50);
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&budget, i] {
      for (int round = 0; round < 2000; ++round) budget.Take(std::to_string(i % 2), 30);
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(budget.used(), 0U);
}

}  // namespace
}  // namespace vorn::server
