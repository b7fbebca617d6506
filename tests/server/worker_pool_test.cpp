#include "worker_pool.h"

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <future>
#include <utility>

#include "sandbox.h"

namespace vorn::server {
namespace {

using std::chrono::hours;
using std::chrono::milliseconds;

constexpr char kLanes[100] = "";

// A job that counts the calls of its functions.
class TestJob : public Job {
 public:
  struct Counts {
    std::atomic<int> done{0};
    std::atomic<int> refused{0};
    std::atomic<int> displaced{0};
    std::atomic<int> expired_waiting{0};
    std::atomic<int> expired_running{0};
  };
  explicit TestJob(Counts& counts, std::function<void()> work = {}) : counts_(counts), work_(std::move(work)) {}

  void Work() override {
    if (work_) work_();
    ++counts_.done;
  }
  void Expire(bool running) override { ++(running ? counts_.expired_running : counts_.expired_waiting); }
  void Refuse(Refused why) override { ++(why == Refused::kClosed ? counts_.refused : counts_.displaced); }

 private:
  Counts& counts_;
  const std::function<void()> work_;
};

// Limits for tests in which a job counts as long only if the test says so.
WorkerPool::Limits Limits(std::size_t short_threads, std::size_t lane_threads, std::size_t lane_queue) {
  WorkerPool::Limits limits;
  limits.short_threads = short_threads;
  limits.lane_threads = lane_threads;
  limits.lane_queue = lane_queue;
  return limits;
}

class WorkerPoolTest : public testing::Test {
 protected:
  ~WorkerPoolTest() override { Release(); }

  bool Submit(WorkerPool& pool, int lane, std::function<void()> work = {}, milliseconds time = hours(1),
              JobSize size = JobSize::kSmall) {
    return pool.Submit({&kLanes[lane], size}, std::make_shared<TestJob>(counts_, std::move(work)), time);
  }
  // Submits a job that runs until Release().
  bool SubmitHanging(WorkerPool& pool, int lane, milliseconds time = hours(1), JobSize size = JobSize::kSmall) {
    const auto hang = [this] {
      most_ = std::max(most_.load(), ++hanging_);
      released_.wait();
      --hanging_;
    };
    return Submit(pool, lane, hang, time, size);
  }
  void Release() {
    if (!std::exchange(is_released_, true)) release_.set_value();
  }

  TestJob::Counts counts_;
  std::atomic<int> hanging_{0};
  std::atomic<int> most_{0};  // hanging at the same time

 private:
  std::promise<void> release_;
  const std::shared_future<void> released_ = release_.get_future().share();
  bool is_released_ = false;
};

TEST_F(WorkerPoolTest, RunsEveryJob) {
  WorkerPool pool(Limits(4, 2, 10000));
  for (int i = 0; i < 10000; ++i) ASSERT_TRUE(Submit(pool, i % 3));
  EXPECT_TRUE(Eventually([&] { return counts_.done == 10000; }));
}

TEST_F(WorkerPoolTest, AHangingLaneKeepsToItsShareOfThreads) {
  WorkerPool pool(Limits(2, 2, 100));
  for (int i = 0; i < 10; ++i) SubmitHanging(pool, 0);
  Submit(pool, 1);
  EXPECT_TRUE(Eventually([&] { return counts_.done == 1; }));
  EXPECT_EQ(most_, 2);
  Release();
  EXPECT_TRUE(Eventually([&] { return counts_.done == 11; }));
  EXPECT_EQ(most_, 2);
}

TEST_F(WorkerPoolTest, ManyHangingLanesLeaveThreadsToOthers) {
  WorkerPool pool(Limits(2, 1, 100));
  for (int lane = 0; lane < 20; ++lane) SubmitHanging(pool, lane);
  EXPECT_TRUE(Eventually([&] { return hanging_ == 20; }));
  Submit(pool, 20);
  EXPECT_TRUE(Eventually([&] { return counts_.done == 1; }));
  Release();
}

TEST_F(WorkerPoolTest, RunsFewShortJobsAtTheSameTime) {
  WorkerPool::Limits limits = Limits(2, 100, 100);
  limits.long_after = hours(1);  // so that even a hanging job is a short one
  WorkerPool pool(limits);
  for (int i = 0; i < 10; ++i) SubmitHanging(pool, i);
  EXPECT_TRUE(Eventually([&] { return hanging_ == 2; }));
  std::this_thread::sleep_for(milliseconds(50));  // in which a third one would begin
  EXPECT_EQ(most_, 2);
  Release();
  EXPECT_TRUE(Eventually([&] { return counts_.done == 10; }));
}

TEST_F(WorkerPoolTest, TakesTheLanesByTurns) {
  WorkerPool::Limits limits = Limits(1, 4, 100);
  limits.long_after = hours(1);
  WorkerPool pool(limits);
  SubmitHanging(pool, 0);
  EXPECT_TRUE(Eventually([&] { return hanging_ == 1; }));
  std::string order;  // one job runs at a time
  const auto submit = [&](int lane, char mark) { Submit(pool, lane, [&order, mark] { order += mark; }); };
  for (int i = 0; i < 4; ++i) submit(1, 'a');
  for (int i = 0; i < 2; ++i) submit(2, 'b');
  submit(3, 'c');
  Release();
  EXPECT_TRUE(Eventually([&] { return counts_.done == 8; }));
  EXPECT_EQ(order, "abcabaa");
}

// A pool with one thread, whose only lane is held until Release(). The jobs record the order in which they run.
class WorkerPoolPeersTest : public WorkerPoolTest {
 protected:
  WorkerPoolPeersTest() {
    SubmitHanging(pool_, 0);
    EXPECT_TRUE(Eventually([this] { return hanging_ == 1; }));
  }
  bool SubmitOf(const char* peer, char mark, unsigned recent_requests = 0) {
    auto job = std::make_shared<TestJob>(counts_, [this, mark] { order_ += mark; });
    return pool_.Submit({&kLanes[0], JobSize::kSmall}, std::move(job), hours(1), {peer, recent_requests});
  }
  std::string OrderOf(int jobs) {
    Release();
    EXPECT_TRUE(Eventually([&] { return counts_.done == 1 + jobs; }));
    return order_;
  }

 private:
  std::string order_;
  WorkerPool pool_{Limits(1, 1, 4)};
};

TEST_F(WorkerPoolPeersTest, TakeTurns) {
  SubmitOf("a", '1');
  SubmitOf("a", '2');
  SubmitOf("b", '3');
  SubmitOf("c", '4');
  EXPECT_EQ(OrderOf(4), "1342");
}

TEST_F(WorkerPoolPeersTest, WithMostJobsMakeRoomForOthers) {
  for (const char mark : {'1', '2', '3'}) SubmitOf("a", mark);
  EXPECT_TRUE(SubmitOf("b", '4', 9));
  EXPECT_TRUE(SubmitOf("b", '5', 9)) << "displaces a job of a";
  EXPECT_EQ(counts_.displaced, 1);
  EXPECT_FALSE(SubmitOf("b", '6', 9)) << "would displace a job of b";
  EXPECT_EQ(counts_.displaced, 1);
  EXPECT_TRUE(SubmitOf("c", '7'));
  EXPECT_EQ(counts_.displaced, 2);
  EXPECT_EQ(OrderOf(4), "1472");
}

TEST_F(WorkerPoolPeersTest, LoseTheJobOfTheirBusiestConnection) {
  SubmitOf("a", '1', 5);
  SubmitOf("a", '2', 7);
  SubmitOf("a", '3', 7);
  SubmitOf("a", '4', 6);
  EXPECT_TRUE(SubmitOf("a", '5', 0));
  EXPECT_EQ(counts_.displaced, 1);
  EXPECT_FALSE(SubmitOf("a", '6', 7)) << "the last one of several goes";
  EXPECT_EQ(OrderOf(4), "1245");
}

TEST_F(WorkerPoolTest, LargeJobsLeaveTheShortThreadsToSmallJobsOfTheSameOwner) {
  WorkerPool::Limits limits = Limits(1, 4, 100);
  limits.long_after = hours(1);
  WorkerPool pool(limits);
  for (int i = 0; i < 10; ++i) SubmitHanging(pool, 0, hours(1), JobSize::kLarge);
  EXPECT_TRUE(Eventually([&] { return hanging_ == 1; }));
  for (int i = 0; i < 100; ++i) Submit(pool, 0);
  EXPECT_TRUE(Eventually([&] { return counts_.done == 100; }));
  EXPECT_EQ(most_, 1) << "one large job of a lane runs at a time";
  Release();
  EXPECT_TRUE(Eventually([&] { return counts_.done == 110; }));
}

TEST_F(WorkerPoolTest, RefusesMoreThanALanesShareOfTheQueue) {
  WorkerPool pool(Limits(1, 1, 2));
  SubmitHanging(pool, 0);
  EXPECT_TRUE(Eventually([&] { return hanging_ == 1; }));
  EXPECT_TRUE(Submit(pool, 0));
  EXPECT_TRUE(Submit(pool, 0));
  EXPECT_FALSE(Submit(pool, 0));
  EXPECT_TRUE(Submit(pool, 1)) << "another lane";
  Release();
  EXPECT_TRUE(Eventually([&] { return Submit(pool, 0); }));
}

TEST_F(WorkerPoolTest, DisplacesAJobOfTheFullestLane) {
  WorkerPool pool(Limits(1, 1, 10));
  EXPECT_FALSE(pool.Displace()) << "no job";
  for (int lane = 0; lane < 2; ++lane) SubmitHanging(pool, lane);
  EXPECT_TRUE(Eventually([&] { return hanging_ == 2; }));
  EXPECT_FALSE(pool.Displace()) << "running jobs stay";
  bool ran = false;
  Submit(pool, 0, [&ran] { ran = true; });
  for (int i = 0; i < 3; ++i) Submit(pool, 1);
  for (int i = 0; i < 2; ++i) EXPECT_TRUE(pool.Displace());
  EXPECT_EQ(counts_.displaced, 2);
  EXPECT_EQ(pool.load().waiting, 2U);
  Release();
  EXPECT_TRUE(Eventually([&] { return counts_.done == 4; }));
  EXPECT_TRUE(ran) << "the only job that waits in its lane";
}

TEST_F(WorkerPoolTest, TellsAJobThatItsDeadlineHasPassed) {
  WorkerPool pool(Limits(1, 1, 10));
  SubmitHanging(pool, 0, std::chrono::seconds(2));  // long enough for a worker to begin
  EXPECT_TRUE(Eventually([&] { return counts_.expired_running == 1; }));
  Submit(pool, 0, {}, milliseconds(1));  // its lane is busy
  EXPECT_TRUE(Eventually([&] { return counts_.expired_waiting == 1; }));
  Submit(pool, 0, {}, hours(1));
  Release();
  EXPECT_TRUE(Eventually([&] { return counts_.done == 2; }));
  EXPECT_EQ(counts_.expired_running, 1);
  EXPECT_EQ(counts_.expired_waiting, 1);
}

TEST_F(WorkerPoolTest, RefusesAJobOnceItIsClosed) {
  WorkerPool pool(Limits(1, 1, 10));
  SubmitHanging(pool, 0);
  EXPECT_TRUE(Eventually([&] { return hanging_ == 1; }));
  Submit(pool, 0);
  Submit(pool, 0);
  pool.Close();
  EXPECT_EQ(counts_.refused, 2);
  EXPECT_FALSE(Submit(pool, 0));
  Release();
  EXPECT_TRUE(Eventually([&] { return counts_.done == 1; })) << "the running job goes on";
}

TEST_F(WorkerPoolTest, DestroysAJobOnceItIsDone) {
  WorkerPool pool(Limits(1, 1, 10));
  auto job = std::make_shared<TestJob>(counts_);
  const std::weak_ptr<TestJob> watched = job;
  pool.Submit({&kLanes[0], JobSize::kSmall}, std::move(job), hours(1));
  EXPECT_TRUE(Eventually([&] { return watched.expired(); }));
}

TEST_F(WorkerPoolTest, LeavesNothingToDoWhenItEnds) {
  {
    WorkerPool pool(Limits(2, 1, 100));
    for (int i = 0; i < 50; ++i) Submit(pool, 0);
  }
  EXPECT_EQ(counts_.done + counts_.refused, 50);
}

}  // namespace
}  // namespace vorn::server
