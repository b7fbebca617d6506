#include "worker_pool.h"

#include <gtest/gtest.h>

#include <atomic>
#include <future>

#include "sandbox.h"

namespace vorn::server {
namespace {

constexpr char kLanes[3] = "";

TEST(WorkerPool, RunsEveryJob) {
  std::atomic<int> done{0};
  {
    WorkerPool pool({4, 2, 10000});
    for (int i = 0; i < 10000; ++i) ASSERT_TRUE(pool.Submit(&kLanes[i % 3], [&done] { ++done; }));
  }
  EXPECT_EQ(done, 10000);
}

TEST(WorkerPool, ABusyLaneLeavesThreadsToTheOthers) {
  std::promise<void> release;
  const std::shared_future<void> released = release.get_future().share();
  std::promise<void> other_done;
  std::atomic<int> busy{0};
  std::atomic<int> most{0};
  {
    WorkerPool pool({3, 2, 100});
    for (int i = 0; i < 10; ++i) {
      pool.Submit(&kLanes[0], [&] {
        most = std::max(most.load(), ++busy);
        released.wait();
        --busy;
      });
    }
    pool.Submit(&kLanes[1], [&] { other_done.set_value(); });
    EXPECT_EQ(other_done.get_future().wait_for(kGenerous), std::future_status::ready);
    release.set_value();
  }
  EXPECT_EQ(most, 2);
}

TEST(WorkerPool, AJobBehindASlowOneGetsAThreadOfItsOwn) {
  std::promise<void> release;
  std::promise<void> second_done;
  {
    WorkerPool pool({2, 2, 100});
    pool.Submit(&kLanes[0], [&] { release.get_future().wait(); });
    pool.Submit(&kLanes[0], [&] { second_done.set_value(); });
    EXPECT_EQ(second_done.get_future().wait_for(kGenerous), std::future_status::ready);
    release.set_value();
  }
}

TEST(WorkerPool, RefusesWhatDoesNotFitIntoTheQueue) {
  std::promise<void> release;
  std::promise<void> begun;
  WorkerPool pool({1, 1, 2});
  pool.Submit(&kLanes[0], [&] {
    begun.set_value();
    release.get_future().wait();
  });
  begun.get_future().wait();
  EXPECT_TRUE(pool.Submit(&kLanes[0], [] {}));
  EXPECT_TRUE(pool.Submit(&kLanes[1], [] {}));
  EXPECT_FALSE(pool.Submit(&kLanes[2], [] {}));
  release.set_value();
  EXPECT_TRUE(Eventually([&] { return pool.Submit(&kLanes[2], [] {}); }));
}

TEST(WorkerPool, EndsWithAFullLaneAndIdleThreads) {
  std::atomic<int> done{0};
  {
    WorkerPool pool({4, 1, 100});
    for (int i = 0; i < 50; ++i) pool.Submit(&kLanes[0], [&done] { ++done; });
  }
  EXPECT_EQ(done, 50);
}

}  // namespace
}  // namespace vorn::server
